// Persistent values by key and domain, shared between processes.
//
// Absent store: no value for any key; writes do nothing.
#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/plist_value.h"

namespace tbdaily {

namespace preference_domain {
inline constexpr std::string_view kJob = "com.velmora.tallyd.tbdaily";
inline constexpr std::string_view kAnalytics = "com.velmora.tallyd";
inline constexpr std::string_view kOwnDefaults = "com.velmora.sysmetrics.tbdaily";
inline constexpr std::string_view kTaskingValues = "com.velmora.da";
inline constexpr std::string_view kLogSubmission =
    "com.velmora.Crashferry";  // consent (kConsentKey) among others
inline constexpr std::string_view kNandInfo = "com.velmora.NANDInfo";
inline constexpr std::string_view kDemoSettings = "com.velmora.demo-settings";
}  // namespace preference_domain

// Whether logs may leave this device, in the domain kLogSubmission. Somebody at the device says so; the job
// never writes it.
inline constexpr std::string_view kConsentKey = "DiagnosticLogSubmissionEnabled";

struct PreferenceBoolean {
  bool value = false;
  bool valid = false;  // the key exists and holds a boolean
};

// One change of a series. The texts are borrowed for the call.
struct PreferenceChange {
  std::string_view key;
  PlistValue value;  // none removes the key
  std::string_view domain;
};

class PreferencesStore {
 public:
  virtual ~PreferencesStore() = default;

  virtual PlistValue getValue(std::string_view key, std::string_view domain) = 0;
  // None removes the key. Visible at once to later reads in this and in other processes.
  virtual void setValue(std::string_view key, const PlistValue& value, std::string_view domain) = 0;
  // Comes to the same as setting one after the other in this order. A store may write each domain once; a
  // change that cannot be written does not keep the others from being written. Answers with the domains that
  // took no change now and may take it later; what is refused for good is not among them.
  virtual std::vector<std::string> applyChanges(std::span<const PreferenceChange> changes) {
    for (const PreferenceChange& change : changes) setValue(change.key, change.value, change.domain);
    return {};
  }
  // Forces what was written to the domain to storage.
  virtual void synchronize(std::string_view domain) = 0;

  // An integer as it is, a real with its fraction dropped (saturating; not a number reads as 0). Anything
  // else, a boolean included, is no number: 0, and `valid` (may be null) is false.
  std::int64_t getInteger(std::string_view key, std::string_view domain, bool* valid = nullptr) {
    const auto number = getValue(key, domain).asNumber();
    if (valid != nullptr) *valid = number.has_value();
    return number ? number->toInt64() : 0;
  }

  PreferenceBoolean getBoolean(std::string_view key, std::string_view domain) {
    const auto boolean = getValue(key, domain).asBoolean();
    return {boolean.value_or(false), boolean.has_value()};
  }

  // Values of another application's domain.
  PlistValue copyApplicationValue(std::string_view key, std::string_view application) {
    return getValue(key, application);
  }
  PreferenceBoolean getApplicationBoolean(std::string_view key, std::string_view application) {
    return getBoolean(key, application);
  }

  // The job's own defaults.
  PlistValue ownValue(std::string_view key) { return getValue(key, preference_domain::kOwnDefaults); }
  void setOwnValue(std::string_view key, const PlistValue& value) {
    setValue(key, value, preference_domain::kOwnDefaults);
  }
  void synchronizeOwn() { synchronize(preference_domain::kOwnDefaults); }
};

}  // namespace tbdaily

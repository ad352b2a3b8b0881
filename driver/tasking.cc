#include "driver/tasking.h"

#include <algorithm>
#include <charconv>
#include <limits>
#include <map>
#include <set>
#include <string>
#include <utility>

#include "platform/device_answers.h"
#include "platform/diagnostics.h"
#include "platform/log_submission.h"
#include "platform/notifications.h"
#include "platform/preferences_store.h"
#include "platform/system_log.h"

namespace tbdaily {

namespace {

constexpr std::string_view kJob = preference_domain::kJob;

std::int32_t saturatingInt32(std::int64_t value) {
  using Limits = std::numeric_limits<std::int32_t>;
  return static_cast<std::int32_t>(std::clamp<std::int64_t>(value, Limits::min(), Limits::max()));
}

std::int32_t integer32(const PlistValue& value) {
  const auto number = value.asNumber();
  return number ? saturatingInt32(number->toInt64()) : 0;
}

PlistValue stringOrNone(const std::optional<std::string>& text) {
  return text ? PlistValue::string(*text) : PlistValue();
}

// Writes settings, and remembers which domains have to reach storage. What a domain does not take for now
// waits in the job's own preferences, and the next run makes it up: one bad file neither costs a setting nor
// keeps later taskings away.
class SettingsWriter {
 public:
  explicit SettingsWriter(PreferencesStore& preferences) : preferences_(preferences) {}

  // What earlier runs could not write. A call before all others.
  void makeUp() {
    const PlistValue waiting = preferences_.getValue(kUnwrittenKey, kJob);
    if (waiting.asArray() == nullptr) return;
    isWaiting_ = true;
    std::vector<PreferenceChange> changes;
    for (const TaskingItem& item : taskingItems(*waiting.asArray())) {
      if (!isConsent(item)) changes.push_back({item.key, item.value, item.domain});
    }
    change(changes);
    record({});
    synchronize();
  }
  void change(const std::vector<PreferenceChange>& changes) {
    const std::vector<std::string> refusing = apply(changes);
    for (const PreferenceChange& change : changes) {
      const std::pair setting(std::string(change.domain), std::string(change.key));
      if (std::ranges::find(refusing, change.domain) != refusing.end()) {
        unwritten_.insert_or_assign(setting, change.value);
      } else {
        unwritten_.erase(setting);
      }
    }
  }
  // Changes of the job's own preferences, together with what waits.
  void record(std::vector<PreferenceChange> changes) {
    if (isWaiting_ || !unwritten_.empty()) changes.push_back({kUnwrittenKey, waiting(), kJob});
    if (apply(changes).empty()) isWaiting_ = !unwritten_.empty();
  }
  void synchronize() {
    for (const std::string& domain : touchedDomains_) preferences_.synchronize(domain);
    touchedDomains_.clear();
  }

 private:
  static constexpr std::string_view kUnwrittenKey = "TaskingUnwritten";

  std::vector<std::string> apply(const std::vector<PreferenceChange>& changes) {
    for (const PreferenceChange& change : changes) touchedDomains_.emplace(change.domain);
    return preferences_.applyChanges(changes);
  }
  // As the items of a tasking; none when nothing waits.
  PlistValue waiting() const {
    PlistArray items;
    for (const auto& [setting, value] : unwritten_) {
      PlistDictionary item{{"Domain", PlistValue::string(setting.first)},
                           {"Key", PlistValue::string(setting.second)}};
      if (value) item.set("Value", value);
      items.push_back(PlistValue::dictionary(std::move(item)));
    }
    return items.empty() ? PlistValue() : PlistValue::array(std::move(items));
  }

  PreferencesStore& preferences_;
  std::set<std::string, std::less<>> touchedDomains_;
  std::map<std::pair<std::string, std::string>, PlistValue>
      unwritten_;           // (domain, key): value, none to remove
  bool isWaiting_ = false;  // the preferences name settings that wait
};

// Applies the scheduled tasking.
class TaskingStep {
 public:
  TaskingStep(Platform& platform, SettingsWriter& settings, const PlistDictionary& tasking,
              std::string_view id, const std::optional<std::string>& build)
      : platform_(platform), settings_(settings), tasking_(tasking), id_(id), build_(build) {}

  void run() {
    const PlistValue currentID = platform_.preferences.getValue("TaskingID", kJob);
    const PlistValue currentOS = platform_.preferences.getValue("TaskingOS", kJob);
    if (!currentID.isNone()) {
      const bool isApplied =
          currentID.asString() == id_ && build_ && currentOS.asString() == std::string_view(*build_);
      if (isApplied) return;
      platform_.systemLog.message(LogLevel::Default,
                                  "Tasking update (%{public}@ -> %{public}@, %{public}@ -> %{public}@)",
                                  currentID, id_, currentOS, stringOrNone(build_));
      withdraw();
    }
    apply();
    settings_.synchronize();
    platform_.notifications.post(kTaskingChangedNotification);
  }

 private:
  void withdraw() {
    const PlistValue payload = platform_.preferences.getValue("TaskingPayload", kJob);
    std::vector<PreferenceChange> removals;
    if (payload.asArray() != nullptr) {
      for (const TaskingItem& item : taskingItems(*payload.asArray())) {
        if (!isConsent(item)) removals.push_back({item.key, {}, item.domain});
      }
    }
    settings_.change(removals);
    settings_.record({{"TaskingID", {}, kJob}, {"TaskingDigest", {}, kJob}, {"TaskingPayload", {}, kJob}});
  }

  void apply() {
    const PlistValue payload = tasking_.get("TaskingPayload");
    if (payload.asArray() == nullptr) return;
    std::vector<PreferenceChange> settings;
    for (const TaskingItem& item : taskingItems(*payload.asArray())) {
      if (isConsent(item)) {
        platform_.diagnostics.error(
            "tbdaily: a tasking cannot say whether logs may leave this device: that item is left out\n");
      } else {
        settings.push_back({item.key, item.value, item.domain});
      }
    }
    settings_.change(settings);
    settings_.record({{"TaskingID", PlistValue::string(std::string(id_)), kJob},
                      {"TaskingOS", stringOrNone(build_), kJob},
                      {"TaskingDigest", tasking_.get("TaskingDigest"), kJob},
                      {"TaskingPayload", payload, kJob}});
  }

  Platform& platform_;
  SettingsWriter& settings_;
  const PlistDictionary& tasking_;
  std::string_view id_;
  const std::optional<std::string>& build_;
};

OSUpdate noteOSChange(Platform& platform, const std::optional<std::string>& build, DayNumber today) {
  OSUpdate last = lastOSUpdate(platform.preferences);
  const PlistValue version = last.version();
  if (!build || version.asString() == std::string_view(*build)) return last;
  platform.systemLog.message(LogLevel::Default, "OS change since last run (%{public}@ -> %{public}@)",
                             version, *build);
  last.record =
      PlistValue::dictionary({{"version", PlistValue::string(*build)}, {"day", PlistValue::int32(today)}});
  platform.preferences.setValue("LastOSUpdate", last.record, kJob);
  return last;
}

void submitOnAggressiveDays(Platform& platform, DayNumber today, const OSUpdate& last) {
  const std::int32_t days = aggressiveDays(platform.logSubmission.taskingValue(kAggressiveDaysKey));
  const std::int32_t elapsed = daysBetween(today, last.day());
  if (elapsed >= days) return;
  platform.systemLog.message(LogLevel::Default,
                             "Aggressive submission day %d of %d; triggering log submission", elapsed, days);
  platform.logSubmission.submitDiagnosticLogs();
}

}  // namespace

PlistValue OSUpdate::version() const {
  return record.get("version");
}
DayNumber OSUpdate::day() const {
  return integer32(record.get("day"));
}

OSUpdate lastOSUpdate(PreferencesStore& preferences) {
  return {preferences.getValue("LastOSUpdate", kJob)};
}

bool isConsent(const TaskingItem& item) {
  return item.domain == preference_domain::kLogSubmission && item.key == kConsentKey;
}

std::vector<TaskingItem> taskingItems(const PlistArray& payload) {
  std::vector<TaskingItem> items;
  items.reserve(payload.size());
  for (const PlistValue& element : payload) {
    // Both texts are shared with the payload, and live as long as it does.
    const PlistValue domain = element.get("Domain"), key = element.get("Key");
    if (domain.asString() && key.asString())
      items.push_back({*domain.asString(), *key.asString(), element.get("Value")});
  }
  return items;
}

std::int32_t aggressiveDays(const PlistValue& value) {
  const auto text = value.asString();
  if (!text) return integer32(value);
  const std::size_t start = std::min(text->find_first_not_of(" \t\n"), text->size());
  const char* digits = text->data() + start;
  const char* end = text->data() + text->size();
  if (digits != end && *digits == '+') ++digits;
  std::int64_t number = 0;
  const auto [rest, error] = std::from_chars(digits, end, number);
  if (error == std::errc::result_out_of_range) {
    return *digits == '-' ? std::numeric_limits<std::int32_t>::min()
                          : std::numeric_limits<std::int32_t>::max();
  }
  return saturatingInt32(number);
}

std::int32_t daysBetween(DayNumber today, DayNumber since) {
  const auto difference = static_cast<std::uint32_t>(today) - static_cast<std::uint32_t>(since);
  return static_cast<std::int32_t>(static_cast<std::int32_t>(difference) < 0 ? 0 - difference : difference);
}

void HandleTaskingAndOSChange(Platform& platform) {
  const DayNumber today = platform.analyticsClient.currentDayNumber();
  const std::optional<std::string> build = platform.deviceAnswers.currentOSBuildVersion();
  const OSUpdate last = noteOSChange(platform, build, today);

  SettingsWriter settings(platform.preferences);
  settings.makeUp();
  const PlistValue scheduled =
      platform.preferences.getValue("ScheduledTasking", preference_domain::kLogSubmission);
  const PlistValue id = scheduled.get("TaskingID");
  if (!id.asString()) return;
  TaskingStep(platform, settings, *scheduled.asDictionary(), *id.asString(), build).run();
  submitOnAggressiveDays(platform, today, last);
}

}  // namespace tbdaily

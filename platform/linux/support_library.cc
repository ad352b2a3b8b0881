// The analytics preference functions that the job binds at run time, as a shared library with these two entry
// points. It acts on the same device root as the job (TBDAILY_ROOT).

#include <cstdint>
#include <cstring>

#include "platform/linux/linux_preferences.h"
#include "platform/plist/codec.h"

namespace {

tbdaily::PreferencesStore& preferences() {
  static const tbdaily::Host host = tbdaily::Host::fromEnvironment();
  static tbdaily::PlistCodec codec;
  static tbdaily::LinuxPreferences store(host, codec);
  return store;
}

}  // namespace

extern "C" {

// 0 when the key is absent or no number. `valid` may be null.
__attribute__((visibility("default"))) std::int64_t SMXPreferencesGetIntegerValue(const char* key,
                                                                                  const char* domain,
                                                                                  bool* valid) {
  if (valid != nullptr) *valid = false;
  if (key == nullptr || domain == nullptr) return 0;
  return preferences().getInteger(key, domain, valid);
}

// Stores a 32-bit number where the value fits, else a 64-bit one.
__attribute__((visibility("default"))) void SMXPreferencesSetValue(const char* key, std::int64_t value,
                                                                   const char* domain) {
  if (key == nullptr || domain == nullptr) return;
  const auto narrow = static_cast<std::int32_t>(value);
  preferences().setValue(
      key, narrow == value ? tbdaily::PlistValue::int32(narrow) : tbdaily::PlistValue::int64(value), domain);
}

}  // extern "C"

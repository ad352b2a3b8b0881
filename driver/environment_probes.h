// Small probes of the analytics store's surroundings: where it lives, how large it is, how often it was found
// damaged.
//
// For the main thread only.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/platform.h"
#include "report/store_probes.h"

namespace tbdaily {

// The library whose functions count how often the store was found damaged.
inline constexpr std::string_view kSupportLibraryPath =
    "/System/Library/PrivateFrameworks/FaultdeskSupport.framework/FaultdeskSupport";

// The preference that they keep the count in.
inline constexpr const char* kCorruptionCountKey = "DatabaseCorruptionCount";
inline constexpr const char* kCorruptionCountDomain = "com.velmora.tallyd";
inline constexpr std::int64_t kBytesPerMiB = 1048576;

// The functions that are bound at run time: the integer value of a key in a domain (the out-flag may be
// null), and its setting.
using PreferencesGetInteger = std::int64_t (*)(const char* key, const char* domain, bool* valid);
using PreferencesSetValue = void (*)(const char* key, std::int64_t value, const char* domain);

// What the probes keep for the life of the process; tests put a fresh one in its place.
struct EnvironmentProbeCache {
  bool isForcedModeLogged = false;
  PreferencesGetInteger getInteger = nullptr;
  PreferencesSetValue setValue = nullptr;
};
extern EnvironmentProbeCache gEnvironmentProbeCache;

// The folder that holds the analytics data, or null when a multi-user device's container cannot be found
// (which is tried again at the next call). Owned by the platform's AnalyticsHome.
const std::string* GetAnalyticsHomePath(Platform& platform);

// Size of the analytics database file in whole MiB, or -1 when it cannot be examined.
std::int64_t GetDatabaseSizeMB(Platform& platform);

// The corruption counter, which is then reset to 0. When the preference functions cannot be bound: 0, and no
// reset.
std::int64_t TakeDatabaseCorruptionCount(Platform& platform);

// The size and the corruption count for a report. Borrows the platform.
StoreProbes storeProbes(Platform& platform);

// Binds the two preference functions, as far as they can be.
void LinkPreferenceFunctions(Platform& platform);

}  // namespace tbdaily

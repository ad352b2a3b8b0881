#include "driver/environment_probes.h"

#include "platform/analytics_home.h"
#include "platform/dynamic_loader.h"
#include "platform/file_system.h"
#include "platform/system_log.h"

namespace tbdaily {

EnvironmentProbeCache gEnvironmentProbeCache;

const std::string* GetAnalyticsHomePath(Platform& platform) {
  const AnalyticsHome::Answer home = platform.analyticsHome.find();
  bool& isForcedModeLogged = gEnvironmentProbeCache.isForcedModeLogged;
  if (home.mode == UserMode::ForcedMultiUser && !isForcedModeLogged) {
    platform.systemLog.message(
        LogLevel::Default,
        "Forcing Multi User Mode behavior due to the presence of /var/db/forceMultiUserMode");
    isForcedModeLogged = true;
  }
  if (home.path == nullptr) {
    platform.systemLog.message(LogLevel::Default, "Error getting system group container: %llu", home.error);
  }
  return home.path;
}

std::int64_t GetDatabaseSizeMB(Platform& platform) {
  const std::string* home = GetAnalyticsHomePath(platform);
  if (home == nullptr) return -1;
  const auto status = platform.fileSystem.status(analyticsDatabasePath(*home));
  return status ? status->size / kBytesPerMiB : -1;
}

void LinkPreferenceFunctions(Platform& platform) {
  const LibraryHandle library = platform.dynamicLoader.open(kSupportLibraryPath);
  if (library == nullptr) {
    platform.systemLog.message(LogLevel::Error, "Failed to dynamically load the FaultdeskSupport framework");
    return;
  }
  EnvironmentProbeCache& cache = gEnvironmentProbeCache;
  cache.getInteger = reinterpret_cast<PreferencesGetInteger>(
      platform.dynamicLoader.symbol(library, "SMXPreferencesGetIntegerValue"));
  if (cache.getInteger == nullptr) {
    platform.systemLog.message(LogLevel::Error, "Failed to dyanmically link SMXPreferencesGetIntegerValue");
  }
  cache.setValue =
      reinterpret_cast<PreferencesSetValue>(platform.dynamicLoader.symbol(library, "SMXPreferencesSetValue"));
  if (cache.setValue == nullptr) {
    platform.systemLog.message(LogLevel::Error, "Failed to dynamically link SMXPreferencesSetValue");
  }
}

std::int64_t TakeDatabaseCorruptionCount(Platform& platform) {
  EnvironmentProbeCache& cache = gEnvironmentProbeCache;
  if (cache.getInteger == nullptr || cache.setValue == nullptr) LinkPreferenceFunctions(platform);
  if (cache.getInteger == nullptr || cache.setValue == nullptr) return 0;
  const std::int64_t count = cache.getInteger(kCorruptionCountKey, kCorruptionCountDomain, nullptr);
  cache.setValue(kCorruptionCountKey, 0, kCorruptionCountDomain);
  return count;
}

StoreProbes storeProbes(Platform& platform) {
  return {[&platform] { return GetDatabaseSizeMB(platform); },
          [&platform] { return TakeDatabaseCorruptionCount(platform); }};
}

}  // namespace tbdaily

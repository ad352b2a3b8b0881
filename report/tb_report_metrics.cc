// Values that the job measures itself at the moment when it writes a report.

#include <array>
#include <vector>

#include "platform/app_registry.h"
#include "platform/byte_reader.h"
#include "platform/kernel.h"
#include "platform/locale_settings.h"
#include "platform/system_log.h"
#include "report/tb_report.h"

namespace tbdaily {

namespace {

constexpr std::string_view kAllAppsKey = "com.velmora.homedeck.numAllInstalledApps";
constexpr std::string_view kThirdPartyAppsKey = "com.velmora.homedeck.numThirdPartyApps";
constexpr std::string_view kDatabaseSizeKey = "com.velmora.sysmetrics.tbkd.database.size";
constexpr std::string_view kDatabaseCorruptionsKey = "com.velmora.sysmetrics.tbkd.database.corruptions";
constexpr std::string_view kUptimeKey = "com.velmora.usage.cur_boot_session_cpu_uptime";
constexpr std::string_view kUnknown = "<unknown>";
constexpr std::int64_t kNotAvailable = -1;

// A kernel value that is reported as it is: read into a buffer of this size, of which the first bytes are the
// number.
struct KernelMetric {
  std::string_view key;
  std::string_view sysctl;
  std::size_t bufferSize;
  std::size_t numberSize;
};

constexpr std::size_t kLargestBuffer = 32;
constexpr std::array<KernelMetric, 5> kKernelMetrics = {{
    {"com.velmora.kernel.memorystatus_freeze_count", "kern.memorystatus_freeze_count", 4, 4},
    {"com.velmora.kernel.memorystatus_freeze_pageouts", "kern.memorystatus_freeze_pageouts", 8, 8},
    {"com.velmora.kernel.memorystatus_freeze_budget_pages_remaining",
     "kern.memorystatus_freeze_budget_pages_remaining", 8, 8},
    {"com.velmora.kernel.memorystatus_thaw_count", "kern.memorystatus_thaw_count", 4, 4},
    {"com.velmora.kernel.swapusage", "vm.swapusage", 32, 8},  // total swap in bytes
}};

std::int64_t readKernelMetric(Kernel& kernel, const KernelMetric& metric) {
  std::array<std::byte, kLargestBuffer> buffer{};
  std::size_t length = metric.bufferSize;
  if (kernel.sysctlByName(metric.sysctl, std::span(buffer).first(metric.bufferSize), length) != 0)
    return kNotAvailable;
  const ByteReader reader(buffer);
  if (metric.numberSize == sizeof(std::uint32_t)) return *reader.at<std::uint32_t>(0);
  return static_cast<std::int64_t>(*reader.at<std::uint64_t>(0));
}

std::string firstOr(const std::vector<std::string>& list, std::string_view substitute) {
  return list.empty() ? std::string(substitute) : list.front();
}

}  // namespace

void TBReport::addInstalledAppInfo() {
  const PlistDictionary* allOptions = scalarOptions(kAllAppsKey);
  const PlistDictionary* thirdPartyOptions = scalarOptions(kThirdPartyAppsKey);
  if (allOptions == nullptr && thirdPartyOptions == nullptr) return;
  const std::string_view userType = platform_.appRegistry.userApplicationType();
  std::int64_t all = 0, user = 0;
  platform_.appRegistry.enumerateBundles(BundleKind::Application, [&](std::string_view type) {
    ++all;
    if (type == userType) ++user;
  });
  if (allOptions != nullptr) addScalarForKeyWithOptions(all, kAllAppsKey, *allOptions);
  if (thirdPartyOptions != nullptr) addScalarForKeyWithOptions(user, kThirdPartyAppsKey, *thirdPartyOptions);
}

void TBReport::addMetadataKeys() {
  LocaleSettings& settings = platform_.localeSettings;
  const std::vector<std::string> preferred = settings.preferredLanguages();
  const std::vector<std::string> localizations =
      settings.bestLocalizations(settings.systemLanguages(), preferred);
  _metadataOutput.set("TBUserInterfaceLanguage", PlistValue::string(firstOr(localizations, kUnknown)));
  _metadataOutput.set("TBPreferredUserInterfaceLanguage", PlistValue::string(firstOr(preferred, kUnknown)));
  if (const auto country = settings.countryCode()) {
    _metadataOutput.set("TBUserSetRegionFormat", PlistValue::string(*country));
  }
}

void TBReport::reportDatabaseSize() {
  addScalarForKeyByExecutingBlock(kDatabaseSizeKey, storeProbes_.databaseSizeMB);
  addScalarForKeyByExecutingBlock(kDatabaseCorruptionsKey, storeProbes_.takeCorruptionCount);
}

void TBReport::reportCPUUptime() {
  addScalarForKeyByExecutingBlock(kUptimeKey, [this]() -> std::int64_t {
    const std::uint64_t ticks = platform_.kernel.tickCount();
    const std::optional<Timebase> timebase = platform_.kernel.timebase();
    if (!timebase || timebase->denominator == 0) {
      platform_.systemLog.message(LogLevel::Error, "Couldn't retrieve mach_timebase_info");
      return kNotAvailable;
    }
    // In this order: another one rounds differently.
    return saturatingInt64(static_cast<double>(timebase->numerator) * 1e-9 /
                           static_cast<double>(timebase->denominator) / 60 * static_cast<double>(ticks));
  });
}

void TBReport::reportVMStats() {
  for (const KernelMetric& metric : kKernelMetrics) {
    addScalarForKeyByExecutingBlock(metric.key, [&] { return readKernelMetric(platform_.kernel, metric); });
  }
}

}  // namespace tbdaily

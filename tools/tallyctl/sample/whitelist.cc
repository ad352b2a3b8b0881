#include "tools/tallyctl/sample/whitelist.h"

#include <array>
#include <span>
#include <string>
#include <string_view>

namespace tbdaily {

namespace {

enum class List { ScalarKeys, ScalarKeyPrefixes, DistributionKeys, DistributionKeyPrefixes };
constexpr std::array<std::string_view, 4> kListNames = {"ScalarKeys", "ScalarKeyPrefixes", "DistributionKeys",
                                                        "DistributionKeyPrefixes"};

// Boundaries of histograms; unused places are 0 and stand at the end.
using Boundaries = std::array<double, 8>;
constexpr Boundaries kNone = {};
constexpr Boundaries kMilliseconds = {5, 10, 25, 50, 100, 250, 1000};
constexpr Boundaries kPercent = {10, 20, 40, 60, 80, 90};
constexpr Boundaries kDegrees = {10, 20, 25, 30, 35, 40, 45};
constexpr Boundaries kShares = {0.05, 0.1, 0.25, 0.5, 0.75};

struct Entry {
  std::string_view group;
  List list;
  std::string_view key;
  std::int64_t bucketInterval;  // 0: no such option
  std::int64_t significantFigures;
  Boundaries intervals;
};

constexpr Entry kEntries[] = {
    {"System", List::ScalarKeys, "com.velmora.homedeck.numAllInstalledApps", 5, 0, kNone},
    {"System", List::ScalarKeys, "com.velmora.homedeck.numThirdPartyApps", 5, 0, kNone},
    {"System", List::ScalarKeys, "com.velmora.homedeck.DiskUsageUserTotalBlocks", 0, 2, kNone},
    {"System", List::ScalarKeys, "com.velmora.homedeck.DiskUsageUserBlocksFree", 1024, 0, kNone},
    {"System", List::ScalarKeys, "com.velmora.sysmetrics.tbkd.database.size", 0, 0, kNone},
    {"System", List::ScalarKeys, "com.velmora.sysmetrics.tbkd.database.corruptions", 0, 0, kNone},
    {"System", List::ScalarKeys, "com.velmora.usage.cur_boot_session_cpu_uptime", 60, 0, kNone},
    {"System", List::ScalarKeyPrefixes, "com.velmora.kernel.", 0, 3, kNone},
    {"System", List::ScalarKeyPrefixes, "com.velmora.NANDInfo.", 0, 0, kNone},
    {"Apps", List::ScalarKeyPrefixes, "app.launches.", 5, 0, kNone},
    {"Apps", List::ScalarKeyPrefixes, "app.foregroundSeconds.", 60, 2, kNone},
    {"Apps", List::DistributionKeyPrefixes, "app.launchTime.", 0, 0, kMilliseconds},
    {"Power", List::ScalarKeys, "power.screenOnMinutes", 10, 0, kNone},
    {"Power", List::ScalarKeys, "power.chargeCycles", 0, 2, kNone},
    {"Power", List::ScalarKeys, "power.temperatureDelta", 5, 0, kNone},
    {"Power", List::DistributionKeys, "power.batteryLevel", 0, 0, kPercent},
    {"Power", List::DistributionKeys, "power.batteryTemperature", 0, 0, kDegrees},
    {"Power", List::DistributionKeys, "power.drainRate", 0, 0, kNone},
    {"Drivers", List::ScalarKeyPrefixes, "com.velmora.kdreport.", 0, 3, kNone},
    {"Network", List::ScalarKeyPrefixes, "net.wifi.", 0, 2, kNone},
    {"Network", List::ScalarKeyPrefixes, "net.", 100, 0, kNone},
    {"Network", List::ScalarKeyPrefixes, "datausage.", 0, 2, kNone},
    {"Network", List::DistributionKeyPrefixes, "net.latency.", 0, 0, kMilliseconds},
    {"Network", List::DistributionKeys, "net.wifi.lossShare", 0, 0, kShares},
    {"Experiments", List::ScalarKeyPrefixes, "experiment.", 0, 0, kNone},
    {"InternalTesting", List::ScalarKeyPrefixes, "internal.", 0, 0, kNone},
    {"InternalTesting", List::DistributionKeyPrefixes, "internal.", 0, 0, kNone},
};

PlistValue number(double value) {
  const auto whole = static_cast<std::int64_t>(value);
  return static_cast<double>(whole) == value ? PlistValue::int64(whole) : PlistValue::float64(value);
}

PlistDictionary optionsOf(const Entry& entry) {
  PlistDictionary options;
  if (entry.bucketInterval != 0) options.set("bucket_interval", PlistValue::int64(entry.bucketInterval));
  if (entry.significantFigures != 0) options.set("sig_fig", PlistValue::int64(entry.significantFigures));
  PlistArray intervals;
  for (const double boundary : entry.intervals) {
    if (boundary != 0) intervals.push_back(number(boundary));
  }
  if (!intervals.empty()) options.set("intervals", PlistValue::array(std::move(intervals)));
  return options;
}

}  // namespace

PlistDictionary sampleWhitelist() {
  PlistDictionary groups;
  for (const Entry& entry : kEntries) {
    const std::string_view listName = kListNames[static_cast<std::size_t>(entry.list)];
    PlistDictionary group = groups.get(entry.group).mutableDictionary();
    PlistDictionary list = group.get(listName).mutableDictionary();
    list.set(entry.key, PlistValue::dictionary(optionsOf(entry)));
    group.set(listName, PlistValue::dictionary(std::move(list)));
    groups.set(entry.group, PlistValue::dictionary(std::move(group)));
  }
  return groups;
}

}  // namespace tbdaily

// The daily report: gathers one day's whitelisted values, coarsens them and writes them as a log for
// submission.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string_view>

#include "platform/analytics_history.h"
#include "platform/platform.h"
#include "platform/plist_value.h"
#include "report/store_probes.h"
#include "report/tb_config.h"

namespace tbdaily {

// Lives for one run: made, written once, released. Borrows the platform.
class TBReport {
 public:
  // Loads the whitelist. Without one the report stays empty and is not written.
  TBReport(Platform& platform, StoreProbes storeProbes);

  // Reads the rows of the day (and of the day before it), keeps what the whitelist allows, and writes the
  // report. `appInfo` is an array of AppInfoRecord, or none.
  void writeLogForYesterdayWithAppInfo(DayNumber day, const PlistValue& appInfo);

 private:
  // Rounds the value as the options say, stores it under the key and returns it.
  std::int64_t addScalarForKeyWithOptions(std::int64_t value, std::string_view key,
                                          const PlistDictionary& options);
  // Runs the producer, once, only when the key is whitelisted, and adds what it returns.
  void addScalarForKeyByExecutingBlock(std::string_view key, const std::function<std::int64_t()>& producer);
  // Consumes the values; stores their statistics and, with "intervals", their histogram.
  void computeAndAddDistributionForKeyWithOptions(DistributionEnumerator& values, std::string_view key,
                                                  const PlistDictionary& options);

  // The built-in metrics, in the order in which a report takes them.
  void addInstalledAppInfo();
  void addMetadataKeys();
  void reportDatabaseSize();
  void reportCPUUptime();
  void reportVMStats();

  // Writes what was gathered, unless that is nothing. From here on the report answers no key.
  void serializeWithDateAndAppInfo(DayNumber day, const PlistValue& appInfo);

  void readHistory(DayNumber day);
  const PlistDictionary* scalarOptions(std::string_view key) const;
  PlistDictionary rootDictionary(DayNumber day, const PlistValue& appInfo,
                                 const std::string& whitelistDigest);
  // The options of the log record: the previous OS version when it is not the current one, which is then
  // remembered.
  PlistValue noteOSVersion();

  Platform& platform_;
  const StoreProbes storeProbes_;
  std::unique_ptr<TBConfig> _config;
  PlistDictionary _scalarsOutput;
  PlistDictionary _distributionsOutput;
  PlistDictionary _histogramsOutput;
  PlistDictionary _metadataOutput;
};

}  // namespace tbdaily

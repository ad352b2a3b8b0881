// Whether a device is well, and why a day would give no report.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "platform/analytics_client.h"
#include "platform/linux/linux_platform.h"
#include "platform/plist/json_writer.h"
#include "tools/tallyctl/spool_contents.h"

namespace tbdaily {

struct WhitelistStatus {
  std::optional<std::string> digest;  // none when it cannot be loaded
  std::vector<std::string> problems;
};

struct StoreStatus {
  bool isUsable = false;
  std::optional<std::string> reason;  // why not
  std::uint64_t bytes = 0;            // of the store and its write-ahead log
  std::optional<DayNumber> firstDay, lastDay;
};

struct DeviceStatus {
  std::string root;
  DayNumber today = 0;
  std::optional<DayNumber> lastDay;  // that was processed
  bool consent = false;
  WhitelistStatus whitelist;
  StoreStatus store;
  SpoolContents spool;
  std::string nextRun;                 // what it would do
  std::vector<std::string> attention;  // one line each: what is wrong and what to do

  bool isWell() const { return attention.empty(); }
};

// Changes nothing on the device, whose root can be used.
DeviceStatus examineDevice(LinuxPlatform& platform);

void writeStatus(JsonWriter& json, const DeviceStatus& status);

}  // namespace tbdaily

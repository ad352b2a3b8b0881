// The reports that a device keeps: those that wait, are withheld or were handed over.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/calendar.h"
#include "platform/linux/base/device_files.h"
#include "platform/plist_value.h"
#include "platform/property_list_codec.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

struct KeptReport {
  std::string path;          // on the device
  std::string stamp;         // of its name, which sorts by the time of writing
  unsigned long number = 0;  // behind the stamp, among reports of one second
};

enum class ReportFolders : std::uint8_t {
  All,
  Leaving,  // Pending/ and Outbox/, never Withheld/
};

// By the files' names alone, the oldest first. A folder that is missing holds none; one that cannot be read
// is a failure.
Outcome<std::vector<KeptReport>> keptReports(const DeviceFiles& files, ReportFolders folders);

// The report in a file on the device; the failure names the file.
Outcome<PlistValue> readKeptReport(const DeviceFiles& files, PropertyListCodec& codec,
                                   const std::string& path);

}  // namespace tbdaily

// The report that would leave the device, built by the job's own code without submitting or changing
// anything.
#pragma once

#include <optional>
#include <string>

#include "platform/analytics_client.h"
#include "platform/linux/linux_platform.h"
#include "platform/plist_value.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

// Builds the report of the day (default: yesterday) as the next run would write it at this moment. Every file
// of the device root stays as it is: the analytics store is read from a copy, and preferences, logs and
// notifications go nowhere.
Outcome<PlistValue> previewReport(LinuxPlatform& platform, std::optional<DayNumber> day);

}  // namespace tbdaily

// The textfile of a device for a textfile collector: what its newest report holds, and its state.
#pragma once

#include <string>

#include "tools/tallyctl/report/daily_report.h"

namespace tbdaily {

class Tool;

// Appends the metrics of a report. What they cannot hold is left out; the answer then says how much, in one
// line, and is empty otherwise.
std::string appendReportMetrics(std::string& text, const DailyReport& report);

// Appends the metrics of the device's state at this moment. What the device does not have is left out; what
// is there and cannot be read is said, and the tool's status says so too.
void appendDeviceMetrics(std::string& text, Tool& tool);

}  // namespace tbdaily

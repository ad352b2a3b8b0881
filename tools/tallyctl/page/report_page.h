// A daily report as a page.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "tools/tallyctl/report/daily_report.h"

namespace tbdaily {

// A run wrote the report; or it is a preview of what would leave the device now, or of what no run would
// write because submission is off.
enum class ReportStanding : std::uint8_t { Written, WouldLeave, WouldNotBeWritten };

// One HTML file that needs nothing else; the same report gives the same bytes. `words` are those by which its
// keys were selected, where they were. Whatever of the report is of another form than a run writes is shown
// as its text, or left out where it has none.
std::string reportPage(const DailyReport& report, ReportStanding standing,
                       const std::vector<std::string>& words = {});

}  // namespace tbdaily

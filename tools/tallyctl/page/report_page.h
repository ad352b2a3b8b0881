// A daily report as a page.
#pragma once

#include <cstdint>
#include <string>

#include "tools/tallyctl/report/daily_report.h"

namespace tbdaily {

// What becomes of the report: it was written by a run, or it is what a run would write now.
enum class ReportStanding : std::uint8_t { Written, Preview };

// One HTML file that needs nothing else; the same report gives the same bytes. Whatever of the report is of
// another form than a run writes is shown as its text, or left out where it has none.
std::string reportPage(const DailyReport& report, ReportStanding standing);

}  // namespace tbdaily

// A daily report as a person reads it.
#pragma once

#include "tools/tallyctl/report/daily_report.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

// What is missing or of another kind is passed over.
void printReport(Terminal& out, const DailyReport& report);

}  // namespace tbdaily

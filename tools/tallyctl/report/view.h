// A daily report as a person reads it.
#pragma once

#include <string>
#include <vector>

#include "tools/tallyctl/report/daily_report.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

// The report with the keys that are selected, of scalars, distributions and histograms; all else stays.
PlistValue selectedKeys(const PlistValue& root, const std::vector<std::string>& words);

// "wifi, cell".
std::string listed(const std::vector<std::string>& words);

// "2026-11-24 (day 20781)".
std::string reportDayText(const DailyReport& report);

// `title`, whose lines behind the first are plain, and, where there is one, the file that it was read from
// stand above it. What is missing or of another kind is passed over.
void printReportHead(Terminal& out, const DailyReport& report, const std::string& title,
                     const std::string& file);
void printReport(Terminal& out, const DailyReport& report, const std::string& title, const std::string& file);

}  // namespace tbdaily

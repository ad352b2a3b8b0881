// A daily report as rows of the tables that many devices' reports are gathered in.
#pragma once

#include <array>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>

#include "tools/tallyctl/export/row_writer.h"
#include "tools/tallyctl/outcome.h"
#include "tools/tallyctl/report/daily_report.h"

namespace tbdaily {

enum class ExportTable : std::uint8_t { Reports, Scalars, Distributions, Histograms };

struct ExportTableDescription {
  ExportTable table;
  std::string_view name;
  std::span<const std::string_view> columns;
};

inline constexpr std::array<std::string_view, 9> kReportColumns{
    "report_id",          "device", "day", "created", "whitelist_digest", "task_id", "language",
    "preferred_language", "region"};
inline constexpr std::array<std::string_view, 5> kScalarColumns{"report_id", "device", "day", "key", "value"};
inline constexpr std::array<std::string_view, 10> kDistributionColumns{
    "report_id", "device", "day", "key", "count", "minimum", "maximum", "mean", "m2", "finite"};
inline constexpr std::array<std::string_view, 7> kHistogramColumns{"report_id", "device", "day",  "key",
                                                                   "lower",     "upper",  "count"};
inline constexpr std::array<ExportTableDescription, 4> kExportTables{{
    {ExportTable::Reports, "reports", kReportColumns},
    {ExportTable::Scalars, "scalars", kScalarColumns},
    {ExportTable::Distributions, "distributions", kDistributionColumns},
    {ExportTable::Histograms, "histograms", kHistogramColumns},
}};

struct ReportOrigin {
  std::string id;      // of the report, wherever a copy of it lies
  std::string device;  // empty where it is not known
};

// Appends the report's rows of that table. An entry that the table's columns cannot hold is left out; the
// answer then says how many, in one line, and is empty otherwise. Fails, without a row, where the report has
// no day.
Outcome<std::string> appendRows(RowWriter& rows, ExportTable table, const DailyReport& report,
                                const ReportOrigin& origin);

}  // namespace tbdaily

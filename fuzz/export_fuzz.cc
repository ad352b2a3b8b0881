// Reports from other devices: every row has its table's fields, in both formats the same rows, and no metric
// has two samples under the same labels.
#include <algorithm>
#include <set>
#include <string>

#include "fuzz/input.h"
#include "platform/plist/codec.h"
#include "platform/plist/json.h"
#include "platform/utf8.h"
#include "tools/tallyctl/export/report_rows.h"
#include "tools/tallyctl/export/textfile.h"

using namespace tbdaily;
using fuzz::require;

namespace {

std::string exported(const DailyReport& report, const ExportTableDescription& table, RowFormat format,
                     std::string& said) {
  std::string text;
  RowWriter rows(format, table.columns, [&text](std::string_view lines) {
    require(lines.ends_with('\n'), "the sink gets whole lines");
    text += lines;
    return true;
  });
  const auto leftOut = appendRows(rows, table.table, report, {"id\t\\", "d\n\"\xff"});
  said = leftOut ? *leftOut : leftOut.reason();
  require(rows.finish(), "the sink takes all");
  require(isUtf8(text) && text.find('\0') == std::string::npos, "rows are text that engines take");
  return text;
}

// Calls with each line.
template <typename Visit>
std::size_t eachLine(std::string_view text, const Visit& visit) {
  std::size_t lines = 0;
  for (; !text.empty(); ++lines) {
    const std::size_t end = text.find('\n');
    require(end != std::string_view::npos, "each line ends");
    visit(text.substr(0, end));
    text.remove_prefix(end + 1);
  }
  return lines;
}

void rowsHaveTheirFields(const DailyReport& report, const ExportTableDescription& table) {
  std::string said, saidToo;
  const std::string tsv = exported(report, table, RowFormat::Tsv, said);
  const std::size_t tsvLines = eachLine(tsv, [&table](std::string_view line) {
    require(std::ranges::count(line, '\t') + 1 == std::ssize(table.columns),
            "a row has a field for each column");
  });
  const std::string json = exported(report, table, RowFormat::Ndjson, saidToo);
  const std::size_t jsonLines = eachLine(json, [&table](std::string_view line) {
    const PlistValue row = plistFromJson(line).value;
    require(row.asDictionary() != nullptr && row.asDictionary()->size() == table.columns.size(),
            "a line is an object with the columns");
  });
  require(tsvLines == jsonLines + 1 && said == saidToo, "both formats have the same rows");
}

void metricsAreApart(const DailyReport& report) {
  std::string text;
  appendReportMetrics(text, report);
  require(isUtf8(text) && text.find('\0') == std::string::npos, "metrics are text");
  std::set<std::string_view> samples;
  eachLine(text, [&samples](std::string_view line) {
    if (line.starts_with("# HELP tbdaily_") || line.starts_with("# TYPE tbdaily_")) return;
    require(line.starts_with("tbdaily_"), "what is no comment is a sample");
    require(samples.insert(line.substr(0, line.rfind(' '))).second, "labels have one sample");
  });
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static PlistCodec codec;
  const auto report = DailyReport::decode(codec.parse(std::as_bytes(std::span(data, size))).value);
  if (!report) return 0;
  for (const ExportTableDescription& table : kExportTables) rowsHaveTheirFields(*report, table);
  metricsAreApart(*report);
  return 0;
}

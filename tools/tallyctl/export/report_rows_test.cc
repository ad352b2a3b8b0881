#include "tools/tallyctl/export/report_rows.h"

#include <gtest/gtest.h>

#include <limits>

#include "tools/tallyctl/export/report_files.h"

namespace tbdaily {
namespace {

const PlistValue kOne = PlistValue::int64(1);

PlistValue real(double value) {
  return PlistValue::float64(value);
}

// The rows of a report with this table, without the line of names, or the failure; then what was left out.
std::string rowsOf(ExportTable table, RowFormat format, PlistDictionary entries, double start = 1795392000) {
  PlistDictionary root{{"TBCrashLogVersion", kOne},
                       {"TBStartDate", PlistValue(PlistDate::fromUnixSeconds(start))}};
  for (const auto& [name, value] : entries) root.set(name, value);
  std::string text;
  RowWriter rows(format, kExportTables[static_cast<std::size_t>(table)].columns,
                 [&text](std::string_view lines) { return text += lines, true; });
  const auto leftOut =
      appendRows(rows, table, *DailyReport::decode(PlistValue::dictionary(std::move(root))), {"i", "d"});
  rows.finish();
  if (format == RowFormat::Tsv) text.erase(0, text.find('\n') + 1);
  return leftOut ? text + *leftOut : text + leftOut.reason();
}

std::string scalarsOf(RowFormat format, PlistDictionary scalars) {
  return rowsOf(ExportTable::Scalars, format, {{"TBScalars", PlistValue::dictionary(std::move(scalars))}});
}

TEST(ReportRows, TextsStayInTheirFields) {
  const PlistDictionary scalars{{"a\tb\nc\rd\\e\"", kOne},
                                {std::string("\0\x1b\xff", 3), kOne},
                                {"ü", PlistValue::int64(std::numeric_limits<std::int64_t>::min())}};
  EXPECT_EQ(scalarsOf(RowFormat::Tsv, scalars),
            "i\td\t2026-11-23\ta\\tb\\nc\\rd\\\\e\"\t1\n"
            "i\td\t2026-11-23\t\xEF\xBF\xBD\x1b\xEF\xBF\xBD\t1\n"
            "i\td\t2026-11-23\tü\t-9223372036854775808\n");
  const std::string lead = R"({"report_id":"i","device":"d","day":"2026-11-23","key":)";
  EXPECT_EQ(scalarsOf(RowFormat::Ndjson, scalars),
            lead + R"("a\tb\nc\rd\\e\"","value":1})" + "\n" + lead + "\"\xEF\xBF\xBD\\u001b\xEF\xBF\xBD\"" +
                R"(,"value":1})" + "\n" + lead + R"("ü","value":-9223372036854775808})" + "\n");
}

TEST(ReportRows, WhatAColumnCannotHoldIsLeftOutAndCounted) {
  EXPECT_EQ(scalarsOf(RowFormat::Tsv, {{"k", kOne}, {"r", real(1)}, {"b", PlistValue::boolean(true)}}),
            "i\td\t2026-11-23\tk\t1\nleft out of TBScalars, since they are no integers: 2");
  EXPECT_EQ(rowsOf(ExportTable::Scalars, RowFormat::Tsv, {{"TBScalars", kOne}}),
            "TBScalars is no dictionary and is left out");
  EXPECT_EQ(rowsOf(ExportTable::Scalars, RowFormat::Tsv, {}), "");
  const PlistValue histogram = PlistValue::dictionary(
      {{"(-inf, 2.5]", kOne}, {"(1e+20, inf)", kOne}, {"2", kOne}, {"(1, 2]", PlistValue::int64(-1)}});
  EXPECT_EQ(
      rowsOf(ExportTable::Histograms, RowFormat::Ndjson,
             {{"TBDistributionsHistogram", PlistValue::dictionary({{"k", histogram}, {"l", kOne}})}}),
      R"({"report_id":"i","device":"d","day":"2026-11-23","key":"k","lower":"-inf","upper":2.5,"count":1})"
      "\n"
      R"({"report_id":"i","device":"d","day":"2026-11-23","key":"k","lower":1e+20,"upper":"inf","count":1})"
      "\nleft out of TBDistributionsHistogram, since they are no buckets with a count: 3");
  for (const double start : {1e13, -1e12, std::numeric_limits<double>::quiet_NaN()})
    EXPECT_EQ(rowsOf(ExportTable::Scalars, RowFormat::Tsv, {}, start),
              "this is no daily report: its TBStartDate is no date of a calendar");
}

TEST(ReportRows, StatisticsAreFiniteBelowTheirLimit) {
  const auto statistics = [](double last, const PlistValue& count) {
    return PlistValue::array({real(-0.5), real(3), real(0.1), real(last), count});
  };
  const PlistValue distributions = PlistValue::dictionary(
      {{"a", statistics(9.9e99, kOne)},
       {"b", statistics(1e100, kOne)},
       {"c", statistics(std::numeric_limits<double>::quiet_NaN(), kOne)},
       {"d", statistics(-std::numeric_limits<double>::infinity(), PlistValue::int64(0))},
       {"e", statistics(1, PlistValue::int64(-1))},
       {"f", statistics(1, real(1))},
       {"g", PlistValue::array({kOne})}});
  const std::string lead = "i\td\t2026-11-23\t";
  EXPECT_EQ(rowsOf(ExportTable::Distributions, RowFormat::Tsv, {{"TBDistributions", distributions}}),
            lead + "a\t1\t-0.5\t3\t0.1\t9.9e+99\t1\n" + lead + "b\t1\t-0.5\t3\t0.1\t1e+100\t0\n" + lead +
                "c\t1\t-0.5\t3\t0.1\tnan\t0\n" + lead + "d\t0\t-0.5\t3\t0.1\t-inf\t0\n" +
                "left out of TBDistributions, since they are no four numbers and a count: 3");
}

TEST(ReportRows, AReportLacksNoField) {
  EXPECT_EQ(rowsOf(ExportTable::Reports, RowFormat::Tsv, {}), "i\td\t2026-11-23\t\t\t\t\t\t\n");
  EXPECT_EQ(
      rowsOf(ExportTable::Reports, RowFormat::Tsv,
             {{"TBLogCreationDate", PlistValue(PlistDate::fromUnixSeconds(1795511224.5))},
              {"TBTaskID", PlistValue::int64(7)},
              {"TBWhitelistDigest", kOne},
              {"TBMetadata", PlistValue::dictionary({{"TBUserSetRegionFormat", PlistValue::string("AT")}})}}),
      "i\td\t2026-11-23\t2026-11-24T09:07:04Z\t\t7\t\t\tAT\n");
}

TEST(ReportFiles, ADeviceIsNamedByTheRootThatItsLogsLieIn) {
  for (const auto& [path, device] : std::initializer_list<std::pair<const char*, const char*>>{
           {"/fleet/d7/var/mobile/Library/Logs/Pending/x.193", "d7"},
           {"d8/var/mobile/Library/Logs/x.193", "d8"},
           {"../d9/./var//mobile/Library/Logs/Outbox/b/x.193", "d9"},
           {"/var/mobile/Library/Logs/in/d1/var/mobile/Library/Logs/Pending/x", "d1"},
           {"/var/mobile/Library/Logs/Pending/x.193", ""},
           {"/fleet/d7/var/mobile/Library/Logs", ""},
           {"x.193", ""}})
    EXPECT_EQ(deviceOfPath(path, "/fleet/here"), device) << path;
}

}  // namespace
}  // namespace tbdaily

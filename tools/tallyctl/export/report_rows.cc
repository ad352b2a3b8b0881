#include "tools/tallyctl/export/report_rows.h"

#include <cmath>

#include "platform/calendar.h"
#include "platform/plist_text.h"

namespace tbdaily {

namespace {

// Beyond it sums of squares leave the range of a double.
constexpr double kFiniteBelow = 1e100;

// Of the years that engines know.
std::string timeText(std::optional<PlistDate> date) {
  if (!date || !isRepresentable(*date)) return {};
  const std::int64_t year = civilTime(*date).year;
  return year >= 1 && year <= 9999 ? dateText(*date, DateFraction::Drop) : std::string();
}

std::string_view textOf(const PlistDictionary& table, std::string_view key) {
  const PlistValue* value = table.find(key);
  return value != nullptr ? value->asString().value_or("") : std::string_view();
}

// Text, whatever somebody applied.
std::string taskIDOf(const PlistDictionary& root) {
  const PlistValue id = root.get("TBTaskID");
  if (const auto text = id.asString()) return std::string(*text);
  return id.isNone() ? std::string() : plistText(id);
}

// A number of values: nothing for what counts none.
std::optional<std::int64_t> countOf(const PlistValue& value) {
  const auto count = value.asInteger();
  return count && *count >= 0 ? count : std::nullopt;
}

void appendReport(RowWriter& rows, const DailyReport& report) {
  rows.begin();
  rows.text(timeText(report.created()));
  rows.text(textOf(report.root(), "TBWhitelistDigest"));
  rows.text(taskIDOf(report.root()));
  for (const std::string_view key :
       {"TBUserInterfaceLanguage", "TBPreferredUserInterfaceLanguage", "TBUserSetRegionFormat"})
    rows.text(textOf(report.metadata(), key));
  rows.end();
}

// The functions for one entry of a table answer how many rows of it were left out.

std::size_t appendScalar(RowWriter& rows, const std::string& key, const PlistValue& value) {
  const auto integer = value.asInteger();
  if (!integer) return 1;
  rows.begin();
  rows.text(key);
  rows.integer(*integer);
  rows.end();
  return 0;
}

std::size_t appendDistribution(RowWriter& rows, const std::string& key, const PlistValue& value) {
  const auto statistics = distributionStatistics(value);
  if (!statistics || !countOf(value.asArray()->back())) return 1;
  const double reals[] = {statistics->minimum, statistics->maximum, statistics->mean,
                          statistics->squaredDeviations};
  rows.begin();
  rows.text(key);
  rows.integer(statistics->count);
  bool isFinite = true;
  for (const double real : reals) {
    rows.real(real);
    isFinite = isFinite && std::fabs(real) < kFiniteBelow;  // which a NaN is not
  }
  rows.integer(isFinite ? 1 : 0);
  rows.end();
  return 0;
}

std::size_t appendHistogram(RowWriter& rows, const std::string& key, const PlistValue& value) {
  if (value.asDictionary() == nullptr) return 1;
  std::size_t leftOut = 0;
  for (const auto& [label, entry] : *value.asDictionary()) {
    const auto bounds = bucketBounds(label);
    const auto count = countOf(entry);
    if (!bounds || !count) {
      ++leftOut;
      continue;
    }
    rows.begin();
    rows.text(key);
    rows.real(bounds->lower);
    rows.real(bounds->upper);
    rows.integer(*count);
    rows.end();
  }
  return leftOut;
}

struct EntryTable {
  std::string_view name;  // in the report
  std::size_t (*append)(RowWriter& rows, const std::string& key, const PlistValue& value);
  std::string_view expected;
};

constexpr EntryTable entryTable(ExportTable table) {
  switch (table) {
    case ExportTable::Scalars:
      return {"TBScalars", appendScalar, "integers"};
    case ExportTable::Distributions:
      return {"TBDistributions", appendDistribution, "four numbers and a count"};
    default:
      return {"TBDistributionsHistogram", appendHistogram, "buckets with a count"};
  }
}

std::string appendEntries(RowWriter& rows, const EntryTable& table, const PlistDictionary& root) {
  const PlistValue* entries = root.find(table.name);
  if (entries == nullptr) return {};
  const std::string name(table.name);
  if (entries->asDictionary() == nullptr) return name + " is no dictionary and is left out";
  std::size_t leftOut = 0;
  for (const auto& [key, value] : *entries->asDictionary()) leftOut += table.append(rows, key, value);
  if (leftOut == 0) return {};
  return "left out of " + name + ", since they are no " + std::string(table.expected) + ": " +
         std::to_string(leftOut);
}

}  // namespace

Outcome<std::string> appendRows(RowWriter& rows, ExportTable table, const DailyReport& report,
                                const ReportOrigin& origin) {
  constexpr std::size_t kDayLength = sizeof("2026-11-24") - 1;
  const std::string day = timeText(report.start()).substr(0, kDayLength);
  if (day.empty()) return Failure{"this is no daily report: its TBStartDate is no date of a calendar"};
  rows.share(std::array<std::string_view, 3>{origin.id, origin.device, day});
  if (table != ExportTable::Reports) return appendEntries(rows, entryTable(table), report.root());
  appendReport(rows, report);
  return std::string();
}

}  // namespace tbdaily

#include "tools/tallyctl/report/view.h"

#include <algorithm>
#include <cmath>

#include "platform/analytics_client.h"
#include "platform/calendar.h"
#include "platform/plist_text.h"
#include "tools/tallyctl/key_selection.h"

namespace tbdaily {

namespace {

using enum Table::Align;

std::string text(const PlistValue& value) {
  return value.isNone() ? "-" : plistText(value);
}

void printHeading(Terminal& out, const std::string& heading, std::size_t count) {
  out.line();
  out.line(out.styled(heading + " (" + std::to_string(count) + ")", Style::Heading));
}

// Side by side where several columns of entries fit the screen, reading downwards.
void printEntries(Terminal& out, const std::string& heading, const PlistDictionary& entries,
                  Table::Align valueAlign) {
  constexpr std::size_t kBeforeKey = 2, kBeforeValue = 2, kMostColumns = 4;
  if (entries.empty()) return;
  printHeading(out, heading, entries.size());
  std::size_t keyWidth = sizeof("key") - 1, valueWidth = sizeof("value") - 1;
  for (const auto& [key, value] : entries) {
    keyWidth = std::max(keyWidth, ShownText(key).columns());
    valueWidth = std::max(valueWidth, ShownText(text(value)).columns());
  }
  const std::size_t one = kBeforeKey + keyWidth + kBeforeValue + valueWidth;
  const std::size_t most = std::clamp<std::size_t>(out.lineWidth() / one, 1, kMostColumns);
  const std::size_t rows = (entries.size() + most - 1) / most;
  const std::size_t columns = (entries.size() + rows - 1) / rows;
  std::vector<Table::Align> aligns;
  std::vector<ShownText> head;
  for (std::size_t column = 0; column < columns; ++column) {
    aligns.insert(aligns.end(), {Left, valueAlign});
    head.insert(head.end(), {"key", "value"});
  }
  Table table(aligns);
  table.add(std::move(head));
  for (std::size_t row = 0; row < rows; ++row) {
    std::vector<ShownText> cells;
    for (std::size_t i = row; i < entries.size(); i += rows)
      cells.insert(cells.end(), {entries.at(i).first, text(entries.at(i).second)});
    table.add(std::move(cells));
  }
  table.print(out);
}

void printHistogram(Terminal& out, const std::vector<HistogramBucket>& buckets) {
  std::vector<BarRow> rows;
  rows.reserve(buckets.size());
  for (const HistogramBucket& bucket : buckets) rows.push_back({bucket.label(), bucket.count});
  printBars(out, rows);
}

// Statistics with the histogram below, where there is one. The report carries the sum of squared deviations;
// a person wants the standard deviation of the day's values.
void printDistributions(Terminal& out, const DailyReport& report) {
  if (report.distributions().empty()) return;
  printHeading(out, "Distributions", report.distributions().size());
  Table table({Left, Right, Right, Right, Right, Right});
  table.add({"key", "count", "minimum", "maximum", "mean", "std. dev."});
  std::vector<std::string_view> keys{{}};  // by row; the first is the header
  for (const auto& [key, value] : report.distributions()) {
    const auto statistics = distributionStatistics(value);
    if (!statistics) continue;
    table.add({key, std::to_string(statistics->count), sixDigits(statistics->minimum),
               sixDigits(statistics->maximum), sixDigits(statistics->mean),
               sixDigits(statistics->standardDeviation())});
    keys.push_back(key);
  }
  table.print(out, [&](std::size_t row) { printHistogram(out, report.buckets(keys[row])); });
}

// Of keys that have no statistics; the job writes none.
void printOtherHistograms(Terminal& out, const DailyReport& report) {
  for (const auto& [key, value] : report.histograms()) {
    if (distributionStatistics(report.distributions().get(key))) continue;
    out.line("  " + key);
    printHistogram(out, report.buckets(key));
  }
}

void printAppInfo(Terminal& out, const PlistDictionary& root) {
  const PlistValue appInfo = root.get("TBActivatedAppInfo");
  const PlistArray* records = appInfo.asArray();
  if (records == nullptr) return;
  printHeading(out, "Activated apps", records->size());
  Table table({Left, Left, Right, Right, Left});
  table.add({"bundle", "version", "kestrelID", "arch", "uuid"});
  for (const PlistValue& record : *records) {
    if (record.asDictionary() == nullptr) continue;
    table.add({text(record.get("bundle")), text(record.get("version")), text(record.get("kestrelID")),
               text(record.get("arch")), text(record.get("uuid"))});
  }
  table.print(out);
}

}  // namespace

PlistValue selectedKeys(const PlistValue& root, const std::vector<std::string>& words) {
  if (words.empty()) return root;
  PlistDictionary selected = root.mutableDictionary();
  for (const std::string_view table : {"TBScalars", "TBDistributions", "TBDistributionsHistogram"}) {
    if (selected.get(table).asDictionary() == nullptr) continue;
    PlistDictionary entries = selected.get(table).mutableDictionary();
    entries.removeIf([&words](std::string_view key) { return !isSelected(key, words); });
    selected.set(table, PlistValue::dictionary(std::move(entries)));
  }
  return PlistValue::dictionary(std::move(selected));
}

std::string listed(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text.append(text.empty() ? "" : ", ").append(word);
  return text;
}

std::string reportDayText(const DailyReport& report) {
  const auto start = report.start();
  if (!start) return "an unknown day";
  return dateText(*start, DateFraction::Drop).substr(0, 10) + " (day " + std::to_string(dayNumberOf(*start)) +
         ")";
}

void printReportHead(Terminal& out, const DailyReport& report, const std::string& title,
                     const std::string& file) {
  const std::size_t firstLine = std::min(title.find('\n'), title.size());
  out.line(out.styled(title.substr(0, firstLine), Style::Heading));
  if (firstLine < title.size()) out.line(ShownText::lines(title.substr(firstLine + 1)));
  const PlistValue tasking = report.root().get("TBTasking");
  Table table({Left, Left});
  if (!file.empty()) table.add({"file", file});
  table.add({"written", report.created() ? dateText(*report.created(), DateFraction::Drop) : "-"});
  table.add({"version", text(report.root().get("TBCrashLogVersion"))});
  table.add({"whitelist digest", text(report.root().get("TBWhitelistDigest"))});
  table.add({"tasking", text(report.root().get("TBTaskID"))});
  table.add({"tasking digest", text(report.root().get("TBTaskDigest"))});
  table.add({"tasking items", std::to_string(tasking.asArray() != nullptr ? tasking.asArray()->size() : 0)});
  table.print(out);
}

void printReport(Terminal& out, const DailyReport& report, const std::string& title,
                 const std::string& file) {
  printReportHead(out, report, title, file);
  printEntries(out, "Metadata", report.metadata(), Left);
  printEntries(out, "Scalars", report.scalars(), Right);
  printDistributions(out, report);
  printOtherHistograms(out, report);
  printAppInfo(out, report.root());
}

}  // namespace tbdaily

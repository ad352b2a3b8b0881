#include "tools/tallyctl/report/view.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <string>

#include "platform/analytics_client.h"
#include "platform/calendar.h"
#include "platform/plist_text.h"

namespace tbdaily {

namespace {

std::string text(const PlistValue& value) {
  return value.isNone() ? "-" : plistText(value);
}

void printHeading(Terminal& out, const std::string& heading, std::size_t count) {
  out.line();
  out.line(out.styled(heading + " (" + std::to_string(count) + ")", Style::Heading));
}

void printHead(Terminal& out, const PlistDictionary& root) {
  const auto start = root.get("TBStartDate").asDate();
  const auto created = root.get("TBLogCreationDate").asDate();
  const PlistValue tasking = root.get("TBTasking");
  const std::string day = start ? dateText(*start, DateFraction::Drop).substr(0, 10) + " (day " +
                                      std::to_string(dayNumberOf(*start)) + ")"
                                : "an unknown day";
  out.line(out.styled("Daily report of " + day, Style::Heading));
  Table table({Table::Align::Left, Table::Align::Left});
  table.add({"written", created ? dateText(*created, DateFraction::Drop) : "-"});
  table.add({"version", text(root.get("TBCrashLogVersion"))});
  table.add({"whitelist digest", text(root.get("TBWhitelistDigest"))});
  table.add({"tasking", text(root.get("TBTaskID"))});
  table.add({"tasking digest", text(root.get("TBTaskDigest"))});
  table.add({"tasking items", std::to_string(tasking.asArray() != nullptr ? tasking.asArray()->size() : 0)});
  table.print(out);
}

void printEntries(Terminal& out, const std::string& heading, const PlistDictionary& entries,
                  Table::Align valueAlign) {
  if (entries.empty()) return;
  printHeading(out, heading, entries.size());
  Table table({Table::Align::Left, valueAlign});
  for (const auto& [key, value] : entries) table.add({key, text(value)});
  table.print(out);
}

// The report carries the sum of squared deviations; a person wants the standard deviation of the day's
// values.
std::string standardDeviation(double squaredDeviations, double count) {
  return count > 0 ? sixDigits(std::sqrt(squaredDeviations / count)) : "0";
}

void printDistributions(Terminal& out, const PlistDictionary& distributions) {
  if (distributions.empty()) return;
  printHeading(out, "Distributions", distributions.size());
  using enum Table::Align;
  Table table({Left, Right, Right, Right, Right, Right});
  table.add({"key", "count", "minimum", "maximum", "mean", "std. dev."});
  for (const auto& [key, value] : distributions) {
    const PlistArray* statistics = value.asArray();
    if (statistics == nullptr || statistics->size() != 5) continue;
    const auto number = [statistics](std::size_t i) {
      const auto n = (*statistics)[i].asNumber();
      return n ? n->toDouble() : std::nan("");
    };
    table.add({key, sixDigits(number(4)), sixDigits(number(0)), sixDigits(number(1)), sixDigits(number(2)),
               standardDeviation(number(3), number(4))});
  }
  table.print(out);
}

void printHistogram(Terminal& out, const std::string& key, const PlistDictionary& buckets) {
  out.line("  " + key);
  std::int64_t largest = 0;
  std::size_t labelWidth = 0, countWidth = 0;
  for (const auto& [label, count] : buckets) {
    largest = std::max(largest, count.asInteger().value_or(0));
    labelWidth = std::max(labelWidth, ShownText(label).columns());
    countWidth = std::max(countWidth, ShownText(text(count)).columns());
  }
  const std::size_t used = labelWidth + countWidth + 8;
  const std::size_t barWidth = std::clamp<std::size_t>(out.width() > used ? out.width() - used : 0, 10, 50);
  for (const auto& [label, count] : buckets) {
    const ShownText shown = text(count);
    const auto value = static_cast<double>(count.asInteger().value_or(0));
    out.line("    " + label + std::string(labelWidth - ShownText(label).columns() + 2, ' ') +
             std::string(countWidth - shown.columns(), ' ') + shown + "  " +
             out.bar(value, static_cast<double>(largest), barWidth));
  }
}

void printAppInfo(Terminal& out, const PlistDictionary& root) {
  const PlistValue appInfo = root.get("TBActivatedAppInfo");
  const PlistArray* records = appInfo.asArray();
  if (records == nullptr) return;
  printHeading(out, "Activated apps", records->size());
  using enum Table::Align;
  Table table({Left, Left, Right, Right, Left});
  for (const PlistValue& record : *records) {
    if (record.asDictionary() == nullptr) continue;
    table.add({text(record.get("bundle")), text(record.get("version")), text(record.get("kestrelID")),
               text(record.get("arch")), text(record.get("uuid"))});
  }
  table.print(out);
}

}  // namespace

void printReport(Terminal& out, const DailyReport& report) {
  printHead(out, report.root());
  printEntries(out, "Metadata", report.metadata(), Table::Align::Left);
  printEntries(out, "Scalars", report.scalars(), Table::Align::Right);
  printDistributions(out, report.distributions());
  if (!report.histograms().empty()) printHeading(out, "Histograms", report.histograms().size());
  for (const auto& [key, buckets] : report.histograms()) {
    if (buckets.asDictionary() != nullptr) printHistogram(out, key, *buckets.asDictionary());
  }
  printAppInfo(out, report.root());
}

}  // namespace tbdaily

// tallyctl usage: the network usage baseline, and what the recording would add to it.

#include <CLI/CLI.hpp>
#include <algorithm>

#include "driver/daily_tasks.h"
#include "driver/data_usage.h"
#include "platform/calendar.h"
#include "platform/linux/replay/recordings.h"
#include "platform/preferences_store.h"
#include "tools/tallyctl/metrics/figures.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

using enum Table::Align;
constexpr double kBytesPerKB = 1024;  // of the analytics keys
constexpr std::size_t kCounters = kTrafficFields.size();

// The traffic of a process since the date, in bytes.
struct ProcessTraffic {
  std::string name;
  std::optional<PlistDate> since;
  std::array<double, kCounters> bytes{};

  double total() const {
    double sum = 0;
    for (const double count : bytes) sum += count;
    return sum;
  }
};

// The most traffic first.
std::vector<ProcessTraffic> trafficOf(const PlistDictionary& baseline) {
  std::vector<ProcessTraffic> all;
  for (const auto& [name, value] : baseline) {
    const PlistArray* entry = value.asArray();
    if (entry == nullptr || entry->size() != 1 + kCounters) continue;
    ProcessTraffic process{name, entry->front().asDate(), {}};
    for (std::size_t i = 0; i < kCounters; ++i) {
      const auto number = (*entry)[1 + i].asNumber();
      process.bytes[i] = number ? static_cast<double>(number->toInt64()) : 0;
    }
    all.push_back(std::move(process));
  }
  std::sort(all.begin(), all.end(), [](const ProcessTraffic& a, const ProcessTraffic& b) {
    return a.total() != b.total() ? a.total() > b.total() : a.name < b.name;
  });
  return all;
}

void addRow(Table& table, const std::string& name, const ProcessTraffic& process) {
  std::vector<ShownText> cells{name, humanBytes(process.total())};
  for (const double count : process.bytes) cells.emplace_back(humanBytes(count));
  cells.emplace_back(process.since ? dateText(*process.since, DateFraction::Drop).substr(0, 10) : "");
  table.add(std::move(cells));
}

void printBaseline(Terminal& out, const PlistDictionary& baseline) {
  const std::vector<ProcessTraffic> all = trafficOf(baseline);
  out.line(out.styled("Traffic to date (" + std::to_string(all.size()) + " processes)", Style::Heading));
  Table table({Left, Right, Right, Right, Right, Right, Left});
  table.add({"process", "total", "Wi-Fi in", "Wi-Fi out", "cell in", "cell out", "since"});
  ProcessTraffic sum;
  for (const ProcessTraffic& process : all) {
    addRow(table, process.name, process);
    for (std::size_t i = 0; i < kCounters; ++i) sum.bytes[i] += process.bytes[i];
  }
  addRow(table, "all", sum);
  table.print(out);
}

void printAdds(Terminal& out, const PlistDictionary& adds) {
  std::vector<std::pair<std::string, std::int64_t>> sorted;
  double sum = 0;
  for (const auto& [key, increment] : adds) {
    sorted.emplace_back(key, increment.asInteger().value_or(0));
    sum += static_cast<double>(sorted.back().second) * kBytesPerKB;
  }
  std::sort(sorted.begin(), sorted.end(), [](const auto& a, const auto& b) {
    return a.second != b.second ? a.second > b.second : a.first < b.first;
  });
  out.line();
  out.line(out.styled("The next run adds (" + std::to_string(adds.size()) + " keys, in KB)", Style::Heading));
  if (sorted.empty()) return out.line("  nothing");
  Table table({Left, Right, Right});
  table.add({"key", "KB", ""});
  for (const auto& [key, increment] : sorted)
    table.add({key, std::to_string(increment), humanBytes(static_cast<double>(increment) * kBytesPerKB)});
  table.add({"all", "", humanBytes(sum)});
  table.print(out);
}

void show(Tool& tool) {
  if (!tool.hasUsableRoot()) return;
  Platform& platform = tool.platform().services();
  Recordings recordings(tool.platform().host(), platform.propertyListCodec);
  const PlistValue stored = platform.preferences.ownValue(kUsageBaselineKey);
  const DayNumber yesterday = dayBefore(platform.analyticsClient.currentDayNumber());
  PlistDictionary adds;
  compareUsage(recordings.entry(recording::kUsage, "records"), stored, yesterday,
               [&adds](std::string_view key, std::int64_t n) {
                 const auto sum = static_cast<std::uint64_t>(adds.get(key).asInteger().value_or(0)) +
                                  static_cast<std::uint64_t>(n);
                 adds.set(key, PlistValue::int64(static_cast<std::int64_t>(sum)));
               });
  if (!tool.hasReadAll()) return;
  const PlistDictionary baseline = stored.mutableDictionary();
  if (tool.printedAsJson(PlistValue::dictionary(
          {{"baseline", PlistValue::dictionary(baseline)}, {"adds", PlistValue::dictionary(adds)}}))) {
    return;
  }
  tool.mayPage();
  printBaseline(tool.out(), baseline);
  printAdds(tool.out(), adds);
}

}  // namespace

void addUsageCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("usage", "Look at the network usage of processes");
  command->require_subcommand(1);
  command->add_subcommand("show", "Show the baseline, and what the recording would add, per process")
      ->callback([&tool] { show(tool); });
}

}  // namespace tbdaily

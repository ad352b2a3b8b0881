// tallyctl usage: the network usage baseline, and what the recording would add to it.

#include <CLI/CLI.hpp>

#include "driver/daily_tasks.h"
#include "driver/data_usage.h"
#include "platform/calendar.h"
#include "platform/linux/replay/recordings.h"
#include "platform/preferences_store.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

std::string kilobytes(const PlistValue& bytes) {
  const auto number = bytes.asNumber();
  return number ? std::to_string(number->toInt64() / 1024) : "0";
}

void printBaseline(Terminal& out, const PlistDictionary& baseline) {
  out.line(out.styled("Baseline (" + std::to_string(baseline.size()) + "), in KB", Style::Heading));
  using enum Table::Align;
  Table table({Left, Left, Right, Right, Right, Right});
  table.add({"process", "counts since", "Wi-Fi in", "Wi-Fi out", "cell in", "cell out"});
  for (const auto& [name, value] : baseline) {
    const PlistArray* entry = value.asArray();
    if (entry == nullptr || entry->size() != 1 + kTrafficFields.size()) continue;
    const auto since = entry->front().asDate();
    table.add({name, since ? dateText(*since, DateFraction::Drop) : "-", kilobytes((*entry)[1]),
               kilobytes((*entry)[2]), kilobytes((*entry)[3]), kilobytes((*entry)[4])});
  }
  table.print(out);
}

void printAdds(Terminal& out, const PlistDictionary& adds) {
  out.line(out.styled("The next run adds (" + std::to_string(adds.size()) + ")", Style::Heading));
  Table table({Table::Align::Left, Table::Align::Right});
  for (const auto& [key, increment] : adds)
    table.add({key, std::to_string(increment.asInteger().value_or(0))});
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

// tallyctl spool: the logs that wait, and making room.

#include <CLI/CLI.hpp>

#include "platform/calendar.h"
#include "platform/kernel.h"
#include "platform/platform.h"
#include "tools/tallyctl/sizes.h"
#include "tools/tallyctl/spool_contents.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

std::optional<SpoolContents> contentsOf(Tool& tool) {
  if (!tool.hasUsableRoot()) return std::nullopt;
  LinuxPlatform& platform = tool.platform();
  auto contents = readSpool(platform.host(), platform.services().propertyListCodec);
  if (contents) return std::move(*contents);
  tool.fail(contents.reason());
  return std::nullopt;
}

std::string plural(std::size_t count, std::string_view one) {
  return std::to_string(count) + " " + std::string(one) + (count == 1 ? "" : "s");
}

void show(Tool& tool) {
  const auto contents = contentsOf(tool);
  if (!contents) return;
  const auto write = [&contents](JsonWriter& json) {
    const auto root = json.object();
    writeSpool(json, *contents);
  };
  if (tool.printedAsJson(write)) return;
  Table table({Table::Align::Left, Table::Align::Right, Table::Align::Right, Table::Align::Left});
  for (const SpoolPart& part : contents->parts)
    table.add(
        {std::string(part.name), plural(part.logs.size(), "log"), sizeText(part.bytes()),
         part.logs.empty() ? "" : "oldest of " + dateText(part.logs.front().created, DateFraction::Drop)});
  table.print(tool.out());
}

struct PruneArguments {
  std::optional<std::uint32_t> keepDays;
  std::string maximum;
  bool dryRun = false;
};

void prune(Tool& tool, const PruneArguments& arguments) {
  PruneLimits limits;
  if (!arguments.maximum.empty()) {
    limits.maximum = parseSize(arguments.maximum);
    if (!limits.maximum)
      return tool.fail("\"" + arguments.maximum + "\" is no size: a number, with K, M or G behind it",
                       kWrongUsage);
  }
  if (!arguments.keepDays && !limits.maximum)
    return tool.fail("spool prune needs --keep-days or --max-size, so that it is known what may stay",
                     kWrongUsage);
  const auto contents = contentsOf(tool);
  if (!contents) return;
  if (arguments.keepDays) {
    constexpr double kDay = 86400;
    limits.olderThan = PlistDate::fromUnixSeconds(
        tool.platform().services().kernel.currentTime().unixSeconds() - kDay * *arguments.keepDays);
  }
  const std::vector<SpooledLog> logs = logsToPrune(*contents, limits);
  std::size_t removed = logs.size();
  if (!arguments.dryRun) {
    const auto outcome = removeLogs(tool.platform().host(), logs);
    if (!outcome) return tool.fail(outcome.reason());
    removed = *outcome;
  }
  std::uint64_t bytes = 0;
  for (const SpooledLog& log : logs) bytes += log.bytes;
  const auto write = [&](JsonWriter& json) {
    const auto root = json.object();
    json.add("dryRun", arguments.dryRun);
    json.add("logs", removed);
    json.add("bytes", bytes);
    const auto names = json.array("removed");
    for (const SpooledLog& log : logs) json.add(log.folder + "/" + log.name);
  };
  if (tool.printedAsJson(write)) return;
  for (const SpooledLog& log : logs) tool.out().line("  " + log.folder + "/" + log.name);
  tool.out().line((arguments.dryRun ? "would remove " : "removed ") + plural(removed, "log") + ", " +
                  sizeText(bytes));
}

}  // namespace

void addSpoolCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("spool", "The logs that wait here, were withheld or handed over");
  command->require_subcommand(1);
  command->add_subcommand("show", "Show how many there are, their size and the age of the oldest")
      ->callback([&tool] { show(tool); });
  auto arguments = std::make_shared<PruneArguments>();
  CLI::App* pruning = command->add_subcommand("prune", "Remove logs, the oldest first");
  pruning->add_option("--keep-days", arguments->keepDays, "Remove logs that are older than so many days")
      ->type_name("N");
  pruning
      ->add_option("--max-size", arguments->maximum,
                   "Remove logs until all together have at most this size: 64M")
      ->type_name("SIZE");
  pruning->add_flag("--dry-run", arguments->dryRun, "Say what would be removed, and remove nothing");
  pruning->callback([&tool, arguments] { prune(tool, *arguments); });
}

}  // namespace tbdaily

// tallyctl record: writes rows of the analytics store.

#include "tools/tallyctl/record.h"

#include <sys/stat.h>

#include <CLI/CLI.hpp>
#include <cerrno>
#include <cstdio>

#include "platform/analytics_home.h"
#include "platform/kernel.h"
#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/store/store_place.h"
#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

// The store of the device, or nothing, with the reason said.
std::unique_ptr<AnalyticsStore> deviceStore(Tool& tool) {
  // The store makes its own folders, but must not make a root that is not there.
  if (!tool.hasUsableRoot()) return nullptr;
  const std::string* home = tool.platform().services().analyticsHome.find().path;
  if (home == nullptr) {
    tool.fail("the device is in multi-user mode and its analytics container cannot be found");
    return nullptr;
  }
  return std::make_unique<AnalyticsStore>(
      storePlaceOf(tool.platform().host().files(), analyticsDatabasePath(*home)));
}

PlistValue count(std::uint64_t n) {
  return PlistValue::int64(static_cast<std::int64_t>(n));
}

void finish(Tool& tool, const std::optional<std::string>& error, const PlistDictionary& counts,
            const std::string& text) {
  if (error) return tool.fail(*error);
  if (!tool.printedAsJson(PlistValue::dictionary(counts))) tool.out().line(text);
}

// The time of the day that was asked for, or nothing, with the reason said.
std::optional<RecordTime> timeOf(Tool& tool, const std::string& day) {
  if (!tool.hasUsableRoot()) return std::nullopt;  // which may hold the clock
  const PlistDate now = tool.platform().services().kernel.currentTime();
  if (day.empty()) return recordTime(now, std::nullopt);
  const auto parsed = tool.dayOf(day);
  return parsed ? std::optional(recordTime(now, *parsed)) : std::nullopt;
}

void runImport(Tool& tool, const std::string& path) {
  const auto closeFile = [](std::FILE* file) { std::fclose(file); };
  FileDescriptor opened;
  struct stat status {};
  // Of any size: no more of it is held than a line.
  if (const int error = path == "-" ? 0 : openHostFile(path, opened); error != 0)
    return tool.fail(path + ": " + errorText(error));
  const bool sized = opened.isOpen() && ::fstat(opened.get(), &status) == 0;
  const std::unique_ptr<std::FILE, decltype(closeFile)> file(
      opened.isOpen() ? ::fdopen(opened.get(), "r") : nullptr, closeFile);
  if (opened.isOpen() && !file) return tool.fail(path + ": " + errorText(errno));
  opened.release();
  const auto store = deviceStore(tool);
  if (!store) return;
  ImportedRows imported;
  std::optional<std::string> error;
  {
    Progress progress("importing", Progress::Of::Bytes,
                      sized ? static_cast<std::uint64_t>(status.st_size) : 0);
    error = recordImport(
        *store, file ? file.get() : stdin, [&progress](std::uint64_t read) { progress.at(read); }, imported);
  }
  finish(tool, error,
         {{"scalars", count(imported.scalars)}, {"distributionValues", count(imported.distributionValues)}},
         "imported " + std::to_string(imported.scalars) + " scalars and " +
             std::to_string(imported.distributionValues) + " distribution values");
}

struct PruneArguments {
  std::string before;
  bool dryRun = false;
  bool force = false;
};

void runPrune(Tool& tool, const PruneArguments& arguments) {
  const auto before = tool.dayOf(arguments.before);
  if (!before) return;
  const auto store = deviceStore(tool);
  if (!store) return;
  // A report is made of yesterday and the day before it.
  const DayNumber firstNeeded = tool.platform().services().analyticsClient.currentDayNumber() - 2;
  if (*before > firstNeeded && !arguments.force && !arguments.dryRun) {
    return tool.fail("a report still needs the days from " + dayText(firstNeeded) + " on: nothing before " +
                     dayText(*before) + " was deleted; keep them with --before " + dayText(firstNeeded) +
                     ", or add --force");
  }
  PrunedRows pruned;
  const auto error =
      recordPrune(*store, *before, arguments.dryRun ? Pruning::Rehearse : Pruning::Remove, pruned);
  finish(tool, error,
         {{"before", PlistValue::string(dayText(*before))},
          {"dryRun", PlistValue::boolean(arguments.dryRun)},
          {"scalars", PlistValue::int64(pruned.scalars)},
          {"distributionValues", PlistValue::int64(pruned.distributionValues)},
          {"keys", PlistValue::int64(pruned.keys)}},
         (arguments.dryRun ? "would remove " : "removed ") + std::to_string(pruned.scalars) +
             " scalars and " + std::to_string(pruned.distributionValues) +
             " distribution values of the days before " + dayText(*before) + "; " +
             std::to_string(pruned.keys) +
             (arguments.dryRun ? " keys would have no rows any more" : " keys have no rows any more"));
}

struct RecordArguments {
  std::string key;
  std::string value;
  std::vector<std::string> values;
  std::string day;  // empty: today
  bool add = false;
};

void runScalar(Tool& tool, const RecordArguments& arguments) {
  const auto value = parseRecordInteger(arguments.value);
  if (!value) return tool.fail("\"" + arguments.value + "\" is no 64-bit integer", kWrongUsage);
  const auto time = timeOf(tool, arguments.day);
  if (!time) return;
  const DayNumber day = time->day;
  const auto store = deviceStore(tool);
  if (!store) return;
  const auto error =
      recordScalar(*store, arguments.key, day, *value, arguments.add ? ScalarChange::Add : ScalarChange::Set);
  finish(tool, error, {{"scalars", count(1)}},
         (arguments.add ? "added to " : "set ") + arguments.key + " on " + dayText(day));
}

void runDistribution(Tool& tool, const RecordArguments& arguments) {
  std::vector<double> values;
  for (const std::string& text : arguments.values) {
    const auto value = parseRecordReal(text);
    if (!value) return tool.fail("\"" + text + "\" is no finite number", kWrongUsage);
    values.push_back(*value);
  }
  const auto time = timeOf(tool, arguments.day);
  if (!time) return;
  const auto store = deviceStore(tool);
  if (!store) return;
  const auto error = recordDistribution(*store, arguments.key, *time, values);
  finish(tool, error, {{"distributionValues", count(values.size())}},
         "appended " + std::to_string(values.size()) + " values to " + arguments.key + " on " +
             dayText(time->day));
}

}  // namespace

void addRecordCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("record", "Write rows of the analytics store");
  command->require_subcommand(1);
  const std::string dayHelp = std::string(kDayArgumentHelp) + " (default: today)";

  auto arguments = std::make_shared<RecordArguments>();
  CLI::App* scalar = command->add_subcommand("scalar", "Set one scalar row");
  scalar->add_option("KEY", arguments->key)->required();
  scalar->add_option("VALUE", arguments->value, "A signed 64-bit integer")->required();
  scalar->add_option("--day", arguments->day, dayHelp)->type_name("DAY");
  scalar->add_flag("--add", arguments->add, "Add to the row's value instead");
  scalar->callback([&tool, arguments] { runScalar(tool, *arguments); });

  CLI::App* distribution = command->add_subcommand("distribution", "Append values to a distribution row");
  distribution->add_option("KEY", arguments->key)->required();
  distribution->add_option("VALUE", arguments->values, "Numbers; nan for a value that is none")->required();
  distribution->add_option("--day", arguments->day, dayHelp)->type_name("DAY");
  distribution->callback([&tool, arguments] { runDistribution(tool, *arguments); });

  auto file = std::make_shared<std::string>("-");
  CLI::App* importing = command->add_subcommand(
      "import",
      "Load tab-separated lines, 's KEY DAY VALUE' or 'd KEY DAY SECONDS VALUE': all of them or none");
  importing->add_option("FILE", *file, "Default: standard input");
  importing->callback([&tool, file] { runImport(tool, *file); });

  auto pruning = std::make_shared<PruneArguments>();
  CLI::App* prune = command->add_subcommand("prune", "Delete the rows of older days");
  prune->add_option("--before", pruning->before, std::string("The first day to keep: ") + kDayArgumentHelp)
      ->required()
      ->type_name("DAY");
  prune->add_flag("--dry-run", pruning->dryRun, "Say what would be deleted, and delete nothing");
  prune->add_flag("--force", pruning->force,
                  "Delete days too that a report still needs, or that are to come");
  prune->callback([&tool, pruning] { runPrune(tool, *pruning); });
}

}  // namespace tbdaily

// tallyctl record: writes rows of the analytics store.

#include "tools/tallyctl/record.h"

#include <sys/stat.h>

#include <CLI/CLI.hpp>
#include <cerrno>
#include <cstdio>

#include "platform/analytics_home.h"
#include "platform/kernel.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/store/store_place.h"
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
  return std::make_unique<AnalyticsStore>(storePlaceOf(tool.platform().host().files(), analyticsDatabasePath(*home)));
}

PlistValue count(std::uint64_t n) {
  return PlistValue::int64(static_cast<std::int64_t>(n));
}

void finish(Tool& tool, const std::optional<std::string>& error, const PlistDictionary& counts,
            const std::string& text) {
  if (error) return tool.fail(*error);
  if (!tool.printedAsJson(PlistValue::dictionary(counts))) tool.out().line(text);
}

RecordTime timeOf(Tool& tool, std::optional<DayNumber> day) {
  return recordTime(tool.platform().services().kernel.currentTime(), day);
}

void runImport(Tool& tool, const std::string& path) {
  const auto closeFile = [](std::FILE* file) { std::fclose(file); };
  std::unique_ptr<std::FILE, decltype(closeFile)> file(path == "-" ? nullptr : std::fopen(path.c_str(), "re"),
                                                       closeFile);
  if (path != "-" && !file) return tool.fail(path + ": " + errorText(errno));
  const auto store = deviceStore(tool);
  if (!store) return;
  struct stat status {};
  const bool sized = file && ::fstat(::fileno(file.get()), &status) == 0;
  ImportedRows imported;
  std::optional<std::string> error;
  {
    Progress progress("importing", sized ? static_cast<std::uint64_t>(status.st_size) : 0);
    error = recordImport(
        *store, file ? file.get() : stdin, [&progress](std::uint64_t read) { progress.at(read); }, imported);
  }
  finish(tool, error,
         {{"scalars", count(imported.scalars)}, {"distributionValues", count(imported.distributionValues)}},
         "imported " + std::to_string(imported.scalars) + " scalars and " +
             std::to_string(imported.distributionValues) + " distribution values");
}

void runPrune(Tool& tool, DayNumber before) {
  const auto store = deviceStore(tool);
  if (!store) return;
  PrunedRows pruned;
  const auto error = recordPrune(*store, before, pruned);
  finish(tool, error,
         {{"scalars", PlistValue::int64(pruned.scalars)},
          {"distributionValues", PlistValue::int64(pruned.distributionValues)},
          {"keys", PlistValue::int64(pruned.keys)}},
         "removed " + std::to_string(pruned.scalars) + " scalars and " +
             std::to_string(pruned.distributionValues) + " distribution values; " +
             std::to_string(pruned.keys) + " keys have no rows any more");
}

struct RecordArguments {
  std::string key;
  std::string value;
  std::vector<std::string> values;
  std::optional<DayNumber> day;
  bool add = false;
};

void runScalar(Tool& tool, const RecordArguments& arguments) {
  const auto value = parseRecordInteger(arguments.value);
  if (!value) return tool.fail("\"" + arguments.value + "\" is no 64-bit integer", kWrongUsage);
  const auto store = deviceStore(tool);
  if (!store) return;
  const DayNumber day = timeOf(tool, arguments.day).day;
  const auto error =
      recordScalar(*store, arguments.key, day, *value, arguments.add ? ScalarChange::Add : ScalarChange::Set);
  finish(tool, error, {{"scalars", count(1)}},
         (arguments.add ? "added to " : "set ") + arguments.key + " on day " + std::to_string(day));
}

void runDistribution(Tool& tool, const RecordArguments& arguments) {
  std::vector<double> values;
  for (const std::string& text : arguments.values) {
    const auto value = parseRecordReal(text);
    if (!value) return tool.fail("\"" + text + "\" is no finite number", kWrongUsage);
    values.push_back(*value);
  }
  const auto store = deviceStore(tool);
  if (!store) return;
  const RecordTime time = timeOf(tool, arguments.day);
  const auto error = recordDistribution(*store, arguments.key, time, values);
  finish(tool, error, {{"distributionValues", count(values.size())}},
         "appended " + std::to_string(values.size()) + " values to " + arguments.key + " on day " +
             std::to_string(time.day));
}

}  // namespace

void addRecordCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("record", "Write rows of the analytics store");
  command->require_subcommand(1);
  const char* dayHelp = "Days since 1970-01-01 (default: today)";

  auto arguments = std::make_shared<RecordArguments>();
  CLI::App* scalar = command->add_subcommand("scalar", "Set one scalar row");
  scalar->add_option("KEY", arguments->key)->required();
  scalar->add_option("VALUE", arguments->value, "A signed 64-bit integer")->required();
  scalar->add_option("--day", arguments->day, dayHelp)->type_name("N");
  scalar->add_flag("--add", arguments->add, "Add to the row's value instead");
  scalar->callback([&tool, arguments] { runScalar(tool, *arguments); });

  CLI::App* distribution = command->add_subcommand("distribution", "Append values to a distribution row");
  distribution->add_option("KEY", arguments->key)->required();
  distribution->add_option("VALUE", arguments->values, "Numbers; nan for a value that is none")->required();
  distribution->add_option("--day", arguments->day, dayHelp)->type_name("N");
  distribution->callback([&tool, arguments] { runDistribution(tool, *arguments); });

  auto file = std::make_shared<std::string>("-");
  CLI::App* importing = command->add_subcommand(
      "import",
      "Load tab-separated lines, 's KEY DAY VALUE' or 'd KEY DAY SECONDS VALUE': all of them or none");
  importing->add_option("FILE", *file, "Default: standard input");
  importing->callback([&tool, file] { runImport(tool, *file); });

  auto before = std::make_shared<DayNumber>(0);
  CLI::App* prune = command->add_subcommand("prune", "Delete the rows of older days");
  prune->add_option("--before", *before, "The first day to keep")->required()->type_name("DAY");
  prune->callback([&tool, before] { runPrune(tool, *before); });
}

}  // namespace tbdaily

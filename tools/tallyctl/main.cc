// tallyctl: makes, feeds, drives and shows a tbdaily device.

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdio>
#include <exception>
#include <string>
#include <vector>

#include "platform/linux/base/process_start.h"
#include "tools/tallyctl/tool.h"

namespace {

using tbdaily::Tool;

void declare(CLI::App& app, Tool& tool) {
  app.description(
      "The companion of tbdaily: makes a sample device, records values, drives the job and shows what it "
      "wrote.");
  app.require_subcommand(1);
  app.fallthrough();
  app.add_option("--root", tool.options.root, "The device root (default: $TBDAILY_ROOT, else /)")
      ->type_name("DIR");
  app.set_version_flag("--version", std::string(TBDAILY_VERSION), "Print the version");
  app.add_flag("--json", tool.options.json, "Print data as JSON");
  tbdaily::addInitCommand(app, tool);
  tbdaily::addRecordCommand(app, tool);
  tbdaily::addSendCommand(app, tool);
  tbdaily::addWaitCommand(app, tool);
  tbdaily::addReportCommand(app, tool);
  tbdaily::addWhitelistCommand(app, tool);
  tbdaily::addPlistCommand(app, tool);
  tbdaily::addTaskingCommand(app, tool);
  tbdaily::addUsageCommand(app, tool);
  tbdaily::addNandCommand(app, tool);
  tbdaily::addBufferCommands(app, tool);
  tbdaily::addWearCommand(app, tool);
  tbdaily::addMetricsCommand(app, tool);
  tbdaily::addCaptureCommand(app, tool);
}

// What CLI11 says of a command that it does not know names everything but the command.
std::string reasonOf(const CLI::App& app, const CLI::ParseError& error, int argc, char** argv) {
  for (int i = 1; i < argc && error.get_exit_code() == static_cast<int>(CLI::ExitCodes::RequiredError); ++i) {
    const std::string word = argv[i];
    if (word == "--root") ++i;
    if (word.empty() || word[0] == '-') continue;
    const bool isKnown =
        !app.get_subcommands([&word](const CLI::App* command) { return command->get_name() == word; })
             .empty();
    return isKnown ? std::string(error.what()) : "there is no command \"" + word + "\"";
  }
  return error.what();
}

// The words of the command line in the reverse order that the parser takes. It would take the word behind an
// empty value, as in "--unit=", for that value: the two are handed over apart.
std::vector<std::string> reversedWords(int argc, char** argv) {
  std::vector<std::string> words;
  bool isOption = true;  // until "--"
  for (int i = 1; i < argc; ++i) {
    std::string word = argv[i];
    isOption = isOption && word != "--";
    const bool hasEmptyValue = isOption && word.starts_with("--") && word.find('=') == word.size() - 1;
    if (hasEmptyValue) word.pop_back();
    words.push_back(std::move(word));
    if (hasEmptyValue) words.emplace_back();
  }
  std::ranges::reverse(words);
  return words;
}

}  // namespace

int main(int argc, char** argv) {
  tbdaily::prepareProcess();
  Tool tool;
  CLI::App app;
  try {
    declare(app, tool);
    app.name("tallyctl");
    app.parse(reversedWords(argc, argv));
  } catch (const CLI::Success& asked) {  // --help
    return app.exit(asked);
  } catch (const CLI::ParseError& error) {
    tool.fail(reasonOf(app, error, argc, argv) + " (try --help)", tbdaily::kWrongUsage);
  } catch (const std::exception& failure) {
    tool.fail(failure.what());
  }
  if (std::fflush(stdout) != 0 && tool.exitStatus == tbdaily::kDone)
    tool.fail("standard output cannot be written");
  return tool.exitStatus;
}

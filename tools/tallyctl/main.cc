// tallyctl: makes, feeds, drives and shows a tbdaily device.

#include <CLI/CLI.hpp>
#include <cstdio>
#include <exception>

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

}  // namespace

int main(int argc, char** argv) {
  Tool tool;
  CLI::App app;
  try {
    declare(app, tool);
    app.parse(argc, argv);
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

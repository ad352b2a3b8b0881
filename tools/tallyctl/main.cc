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
  app.add_flag("--json", tool.options.json, "Print data as JSON");
  tbdaily::addInitCommand(app, tool);
  tbdaily::addRecordCommand(app, tool);
  tbdaily::addSendCommand(app, tool);
  tbdaily::addWaitCommand(app, tool);
  tbdaily::addReportCommand(app, tool);
  tbdaily::addWhitelistCommand(app, tool);
  tbdaily::addPlistCommand(app, tool);
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
    tool.fail(std::string(error.what()) + " (try --help)", tbdaily::kWrongUsage);
  } catch (const std::exception& failure) {
    tool.fail(failure.what());
  }
  if (std::fflush(stdout) != 0 && tool.exitStatus == tbdaily::kDone)
    tool.fail("standard output cannot be written");
  return tool.exitStatus;
}

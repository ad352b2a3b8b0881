#include "tools/tallyctl/commands/declare.h"

#include <array>

namespace tbdaily {

namespace {

using AddCommand = void (*)(CLI::App& program, Tool& tool);

struct CommandGroup {
  const char* name;
  std::array<AddCommand, 8> commands;  // those that there are
};

constexpr std::array<CommandGroup, 4> kGroups{{
    {"Is it well",
     {addStatusCommand, addReportCommand, addWearCommand, addNandCommand, addMetricsCommand,
      addUsageCommand}},
    {"What may be reported, and leave",
     {addConsentCommand, addWhitelistCommand, addGroupCommand, addTaskingCommand, addSpoolCommand}},
    {"A device to try",
     {addInitCommand, addCaptureCommand, addRecordCommand, addSendCommand, addWaitCommand}},
    {"Files and buffers", {addExportCommand, addPlistCommand, addBufferCommands}},
}};

}  // namespace

void declareCommands(CLI::App& program, Tool& tool) {
  program.name("tallyctl");
  program.description(
      "The companion of tbdaily: says whether a device is well, shows what is reported, and drives the job");
  program.require_subcommand(1);
  program.fallthrough();
  program
      .add_option("--root", tool.options.root,
                  "The device root; else $TBDAILY_ROOT, else the one in /etc/default/tbdaily, else /")
      ->type_name("DIR");
  program.add_flag("--json", tool.options.json, "Print data as JSON");
  program.add_flag("--no-pager", tool.options.noPager,
                   "Print what is longer than the screen without a pager");
  program.set_version_flag("--version", std::string(TBDAILY_VERSION), "Print the version");
  program.get_option("--help")->description("Print this help");
  for (const CommandGroup& group : kGroups) {
    for (const AddCommand add : group.commands) {
      if (add == nullptr) break;
      const std::size_t before = program.get_subcommands({}).size();
      add(program, tool);
      const auto all = program.get_subcommands({});
      for (std::size_t i = before; i < all.size(); ++i) all[i]->group(group.name);
    }
  }
  addHelpCommand(program, tool);
  addCompleteCommand(program, tool);
}

}  // namespace tbdaily

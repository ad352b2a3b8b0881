// What every subcommand of tallyctl has at hand: the platform over the device root, the way to print, the way
// to fail.
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/analytics_client.h"
#include "platform/linux/linux_platform.h"
#include "platform/plist/json_writer.h"
#include "platform/plist_value.h"
#include "tools/tallyctl/terminal.h"

namespace CLI {
class App;
}

namespace tbdaily {

// Exit statuses of the program.
enum ExitStatus : int { kDone = 0, kFailed = 1, kWrongUsage = 2 };

class Tool {
 public:
  // What the common options say. An empty root means TBDAILY_ROOT, else that of kDefaultsFile, else "/".
  struct Options {
    std::string root;
    bool json = false;
    bool noPager = false;
  };

  Options options;
  int exitStatus = kDone;

  // Made at the first call, when the options are known; the root then stands in TBDAILY_ROOT, where the
  // support library looks.
  LinuxPlatform& platform();
  // Whether the root is a folder that is there; says so when it is not.
  bool hasUsableRoot();
  // Whether all that a command looked at on the device was read or is not there. What was not has been named
  // on standard error: the command then has failed and must not answer as if nothing were there.
  bool hasReadAll();
  // Whether the user named a root, by option or in the environment.
  bool namesRoot() const;

  Terminal& out() { return out_; }
  // Shows on a pager what is longer than the screen: for commands that show something and end. Not for JSON,
  // which other programs read.
  void mayPage();

  // Prints the value, or what the function writes, as JSON when --json was given; answers whether it did.
  bool printedAsJson(const PlistValue& value);
  bool printedAsJson(const std::function<void(JsonWriter& json)>& write);

  // The day that the text names, or nothing, with the reason said: wrong usage.
  std::optional<DayNumber> dayOf(const std::string& text);

  // One line on standard error with the reason; it names the root where the command looked at one.
  void fail(std::string_view reason, int status = kFailed);

 private:
  std::unique_ptr<LinuxPlatform> platform_;
  Terminal out_;
};

// One function for each subcommand, in a file of its own; it declares the options and what runs.
void addStatusCommand(CLI::App& app, Tool& tool);
void addConsentCommand(CLI::App& app, Tool& tool);
void addGroupCommand(CLI::App& app, Tool& tool);
void addSpoolCommand(CLI::App& app, Tool& tool);
void addInitCommand(CLI::App& app, Tool& tool);
void addRecordCommand(CLI::App& app, Tool& tool);
void addSendCommand(CLI::App& app, Tool& tool);
void addWaitCommand(CLI::App& app, Tool& tool);
void addReportCommand(CLI::App& app, Tool& tool);
void addExportCommand(CLI::App& app, Tool& tool);
void addWhitelistCommand(CLI::App& app, Tool& tool);
void addPlistCommand(CLI::App& app, Tool& tool);
void addTaskingCommand(CLI::App& app, Tool& tool);
void addUsageCommand(CLI::App& app, Tool& tool);
void addBufferCommands(CLI::App& app, Tool& tool);
void addNandCommand(CLI::App& app, Tool& tool);
void addWearCommand(CLI::App& app, Tool& tool);
void addMetricsCommand(CLI::App& app, Tool& tool);
void addCaptureCommand(CLI::App& app, Tool& tool);
void addHelpCommand(CLI::App& app, Tool& tool);
void addCompleteCommand(CLI::App& app, Tool& tool);

}  // namespace tbdaily

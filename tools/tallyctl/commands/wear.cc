// tallyctl wear: how much drives are worn, what they recommend, and how that went over the days.

#include <CLI/CLI.hpp>
#include <limits>
#include <span>

#include "drivermetrics/kd_report.h"
#include "storage/content_deletion.h"
#include "storage/storage_connection.h"
#include "storage/write_amplification.h"
#include "tools/tallyctl/controller_buffer.h"
#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/metrics/sampler.h"
#include "tools/tallyctl/metrics/selection.h"
#include "tools/tallyctl/output_file.h"
#include "tools/tallyctl/page/wear_page.h"
#include "tools/tallyctl/tool.h"
#include "tools/tallyctl/wear/view.h"

namespace tbdaily {

namespace {

// Of the exit status with --check, added up.
constexpr int kWorthWatching = 4, kActNow = 8;
constexpr int kDaysOfPace = 30;
constexpr std::string_view kNvmeDriver = "nvme";
// Statistics that stand in the answer under their own names, where the controller has them.
constexpr std::string_view kWearStats[] = {"percentUsed", "slcPercentUsed", "maxHighEnduranceBlockErases",
                                           "bandErases", "intermediateBandErases"};

struct WearArguments {
  bool raw = false, check = false, history = false;
  std::optional<std::int64_t> days, endurance;
  std::optional<std::string> html;  // a file for the page
};

// The drives that the driver of NVMe drives tells of; a failure has been said then.
std::optional<std::vector<DriveHealth>> liveDrives(Tool& tool) {
  std::vector<DriveHealth> drives;
  ChannelFilter filter;
  filter.driver = kNvmeDriver;
  const ChannelSelection selection = selectChannels(tool, filter);
  if (!selection.channels) return std::nullopt;
  if (selection.selected == 0) return drives;
  ChannelSampler sampler(tool, *selection.channels);
  if (!sampler) return std::nullopt;
  const kdreport::KdReportCollection samples = sampler.sample();
  if (!samples) return std::nullopt;
  const auto values = readChannels(samples.get(), ChannelContents::Values);
  return values ? nvmeHealth(*values) : drives;
}

// Nothing when it cannot be had, which has been said then.
std::optional<WearMoment> wearOfNow(Tool& tool) {
  WearMoment wear;
  Platform& platform = tool.platform().services();
  QuietDiagnostics quiet;
  const FetchedStats stats(platform.driverRegistry, quiet);
  if (!tool.hasReadAll()) return std::nullopt;
  const auto preferred = preferredWriteAmplificationThreshold(platform.preferences);
  wear.threshold = preferred ? static_cast<double>(*preferred) : kDefaultWriteAmplificationThreshold;
  if (stats) {
    ControllerJudgement judgement;
    judgement.amplification = computeWriteAmplification(stats.context());
    judgement.isAbove = isAboveThreshold(judgement.amplification.user, platform.preferences);
    judgement.recommendsContentDeletion = NandRecommendsContentDeletion(platform.driverRegistry, quiet);
    wear.controller = judgement;
    wear.drives.push_back(controllerHealth(stats.context()));
  } else {
    auto drives = liveDrives(tool);
    if (!drives) return std::nullopt;
    wear.drives = std::move(*drives);
  }
  if (!tool.hasReadAll()) return std::nullopt;
  if (wear.drives.empty()) {
    tool.fail("the controller's statistics cannot be had, and no NVMe drive tells of its health");
    return std::nullopt;
  }
  wear.findings = findingsOf(wear.drives);
  if (wear.controller && wear.controller->recommendsContentDeletion)
    wear.findings.push_back({Urgency::Watch, "the controller recommends that content be deleted: make room"});
  return wear;
}

void writeJson(JsonWriter& json, const WearMoment& wear) {
  const auto root = json.object();
  const ControllerJudgement judgement = wear.controller.value_or(ControllerJudgement());
  const auto own = [&wear](double value) { return wear.controller ? std::optional(value) : std::nullopt; };
  json.add("userWriteAmplification", own(judgement.amplification.user));
  json.add("systemWriteAmplification", own(judgement.amplification.system));
  json.add("threshold", wear.threshold);
  json.add("aboveThreshold", judgement.isAbove);
  json.add("recommendsContentDeletion", judgement.recommendsContentDeletion);
  for (const std::string_view name : kWearStats) {
    if (!wear.controller) break;
    for (const auto& [known, value] : wear.drives.front().raw) {
      if (known == name) json.add(name, value);
    }
  }
  json.add("verdict", healthVerdict(wear.findings));
  {
    const auto findings = json.array("findings");
    for (const HealthFinding& finding : wear.findings) {
      const auto entry = json.object();
      json.add("urgent", finding.urgency == Urgency::Act);
      json.add("text", finding.text);
    }
  }
  const auto drives = json.array("drives");
  for (const DriveHealth& drive : wear.drives) {
    const auto entry = json.object();
    json.add("name", drive.name);
    json.add("writeAmplification", drive.writeAmplification());
    for (const HealthFigure& figure : kHealthFigures) json.add(figure.name, drive.*figure.figure);
  }
}

void showWear(Tool& tool, const WearArguments& arguments) {
  if (!tool.hasUsableRoot()) return;
  const auto wear = wearOfNow(tool);
  if (!wear) return;
  if (!tool.printedAsJson([&wear](JsonWriter& json) { writeJson(json, *wear); }))
    arguments.raw ? printRawWear(tool.out(), *wear) : printWear(tool.out(), *wear);
  if (!arguments.check) return;
  for (const HealthFinding& finding : wear->findings)
    tool.exitStatus |= finding.urgency == Urgency::Act ? kActNow : kWorthWatching;
}

void writeJson(JsonWriter& json, const WearHistory& history) {
  const auto root = json.array();
  for (const WearDay& day : history.days) {
    const auto entry = json.object();
    json.add("day", dayText(day.day));
    json.add("hostWrites", day.hostWrites);
    json.add("flashWrites", day.flashWrites);
    json.add("writeAmplification", day.writeAmplification);
    json.add("hottestCycle", day.hottestCycle);
    json.add("wentBack", day.wentBack);
  }
}

void writePage(Tool& tool, const WearArguments& arguments, const WearHistory& history) {
  const std::string page = wearPage(
      history, {tool.platform().host().root().native(), wearPace(history, kDaysOfPace), arguments.endurance});
  const auto written = writeOutputFile(*arguments.html, std::as_bytes(std::span(page)));
  if (!written) return tool.fail(written.reason());
  if (*arguments.html != "-")
    tool.out().line("wrote " + std::to_string(page.size()) + " bytes to " + *arguments.html);
}

void showHistory(Tool& tool, const WearArguments& arguments) {
  if (!tool.hasUsableRoot()) return;
  LinuxPlatform& platform = tool.platform();
  const DayNumber today = platform.services().analyticsClient.currentDayNumber();
  const std::int64_t first =
      arguments.days ? std::int64_t{today} - *arguments.days + 1 : std::numeric_limits<DayNumber>::min();
  const auto history = readWearHistory(platform, static_cast<DayNumber>(first), today);
  if (!tool.hasReadAll()) return;
  if (!history) return tool.fail(history.reason());
  if (arguments.html) return writePage(tool, arguments, *history);
  if (tool.printedAsJson([&history](JsonWriter& json) { writeJson(json, *history); })) return;
  if (history->days.empty()) {
    tool.out().line(arguments.days
                        ? "The store holds no figures of the controller for these days."
                        : "The store holds no figures of the controller: a run records them each day.");
    return;
  }
  tool.mayPage();
  printWearHistory(tool.out(), *history, wearPace(*history, kDaysOfPace), arguments.endurance);
}

}  // namespace

void addWearCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand(
      "wear", "Show how much the drives are worn, with a verdict; or how that went over the days");
  auto arguments = std::make_shared<WearArguments>();
  CLI::Option* raw = command->add_flag("--raw", arguments->raw, "Show the figures by the drive's own names");
  CLI::Option* check =
      command->add_flag("--check", arguments->check,
                        "End with 4 where something is worth watching, 8 where something is to be "
                        "done now, 12 for both: for monitoring");
  CLI::Option* history =
      command->add_flag("--history", arguments->history, "Show what the store has kept of each day");
  history->excludes(raw)->excludes(check);
  command->add_option("--days", arguments->days, "With --history: the last so many days (default: all)")
      ->type_name("N")
      ->check(CLI::Range(1, 1'000'000))
      ->needs(history);
  command
      ->add_option("--endurance", arguments->endurance,
                   "With --history: say when the most worn block meets so many erases")
      ->type_name("CYCLES")
      ->check(CLI::Range(std::int64_t{1}, std::numeric_limits<std::int64_t>::max()))
      ->needs(history);
  command
      ->add_option(
          "--html", arguments->html,
          "With --history: write it to this file, as a page for a browser that needs nothing else; - is "
          "standard output")
      ->type_name("FILE")
      ->needs(history);
  command->callback([&tool, arguments] {
    if (arguments->html && tool.options.json)
      return tool.fail("--html writes a page and does not go with --json", kWrongUsage);
    arguments->history ? showHistory(tool, *arguments) : showWear(tool, *arguments);
  });
}

}  // namespace tbdaily

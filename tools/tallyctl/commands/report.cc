// tallyctl report: shows a daily report, or the one that would leave the device, and what its keys went
// through.

#include <CLI/CLI.hpp>
#include <filesystem>
#include <optional>
#include <span>

#include "platform/log_submission.h"
#include "platform/platform.h"
#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/input_file.h"
#include "tools/tallyctl/key_selection.h"
#include "tools/tallyctl/output_file.h"
#include "tools/tallyctl/page/report_page.h"
#include "tools/tallyctl/report/daily_report.h"
#include "tools/tallyctl/report/kept_reports.h"
#include "tools/tallyctl/report/key_views.h"
#include "tools/tallyctl/report/preview.h"
#include "tools/tallyctl/report/view.h"
#include "tools/tallyctl/tool.h"
#include "tools/tallyctl/whitelist_review.h"

namespace tbdaily {

namespace {

struct ReportArguments {
  std::vector<std::string> words;  // the first may be a file
  std::string day;
  std::optional<std::string> html;  // a file for the page
  bool preview = false, raw = false, identifiability = false;
};

// A report with where it comes from.
struct FoundReport {
  PlistValue root;
  std::string file;  // as it is named to the user; empty for a preview
};

// The first of the words, where it names a file; it is taken from them then.
std::optional<std::string> takeFile(std::vector<std::string>& words) {
  if (words.empty()) return std::nullopt;
  std::error_code ignored;
  const std::string& first = words.front();
  const auto type = std::filesystem::status(first, ignored).type();
  const bool isThere =
      type != std::filesystem::file_type::not_found && type != std::filesystem::file_type::directory;
  if (first != "-" && first.find('/') == std::string::npos && !isThere) return std::nullopt;
  std::string file = first;
  words.erase(words.begin());
  return file;
}

Outcome<FoundReport> readFile(Tool& tool, const std::string& file) {
  auto root = readPlistFile(tool.platform().services().propertyListCodec, file);
  if (!root) return Failure{root.reason()};
  return FoundReport{std::move(*root), file == "-" ? "standard input" : file};
}

// The newest report of the device, or that of the day.
Outcome<FoundReport> readKept(Tool& tool, std::optional<DayNumber> day) {
  const DeviceFiles& files = tool.platform().host().files();
  const auto reports = keptReports(files, ReportFolders::All);
  if (!reports) return Failure{reports.reason()};
  for (std::size_t i = reports->size(); i-- > 0;) {  // the newest first
    const std::string& path = (*reports)[i].path;
    auto root = readKeptReport(files, tool.platform().services().propertyListCodec, path);
    if (!root && !day) return Failure{root.reason()};
    const auto start = root ? root->get("TBStartDate").asDate() : std::nullopt;
    if (!day || (start && dayNumberOf(*start) == *day))
      return FoundReport{std::move(*root), files.place(path).native()};
  }
  if (day) return Failure{"there is no report of " + dayText(*day) + " here"};
  return Failure{"there is no report yet in " + files.root().native() +
                 "; run tbdaily -f, or look at what it would write with --preview"};
}

Outcome<FoundReport> buildPreview(Tool& tool, std::optional<DayNumber> day) {
  auto preview = previewReport(tool.platform(), day);
  if (!preview) return Failure{preview.reason()};
  return FoundReport{std::move(*preview), {}};
}

bool hasSelectedKeys(const DailyReport& report) {
  return !report.scalars().empty() || !report.distributions().empty() || !report.histograms().empty();
}

void showStories(Tool& tool, const DailyReport& report, const std::vector<std::string>& words) {
  auto stories = keyStories(tool.platform(), report);
  if (!tool.hasReadAll()) return;
  if (!stories) return tool.fail(stories.reason());
  std::erase_if(*stories, [&words](const KeyStory& story) { return !isSelected(story.key, words); });
  if (!tool.printedAsJson([&stories](JsonWriter& json) { writeKeyStories(json, *stories); }))
    printKeyStories(tool.out(), *stories);
}

void showIdentifiability(Tool& tool, const DailyReport& report) {
  const auto whitelist = whitelistOf(tool.platform(), report);
  if (!tool.hasReadAll()) return;
  if (!whitelist) return tool.fail(whitelist.reason());
  const Identifiability found = identifiabilityOf(report, *(*whitelist)->config);
  if (!tool.printedAsJson([&found](JsonWriter& json) { writeIdentifiability(json, found); }))
    printIdentifiability(tool.out(), found);
}

// What stands above a preview, and the other logs behind it.
std::string titleOf(Tool& tool, const ReportArguments& arguments, const DailyReport& report) {
  const std::string selection =
      arguments.words.empty() ? "" : "\n  Only keys with " + listed(arguments.words) + " are shown.";
  if (!arguments.preview) return "Daily report of " + reportDayText(report) + selection;
  return "Preview of the daily report of " + reportDayText(report) + selection + "\n" +
         (tool.platform().services().logSubmission.isDiagnosticLogSubmissionEnabled()
              ? "  Submission is on: this would leave the device."
              : "  Submission is off: no report would be written (tallyctl consent on).");
}

void writePage(Tool& tool, const ReportArguments& arguments, const DailyReport& report) {
  ReportStanding standing = ReportStanding::Written;
  if (arguments.preview)
    standing = tool.platform().services().logSubmission.isDiagnosticLogSubmissionEnabled()
                   ? ReportStanding::WouldLeave
                   : ReportStanding::WouldNotBeWritten;
  const std::string page = reportPage(report, standing, arguments.words);
  const std::string& file = *arguments.html;
  const auto written = writeOutputFile(file, std::as_bytes(std::span(page)));
  if (!written) return tool.fail(written.reason());
  if (file != "-") tool.out().line("wrote " + std::to_string(page.size()) + " bytes to " + file);
}

void show(Tool& tool, ReportArguments arguments) {
  if (arguments.html && tool.options.json)
    return tool.fail("--html writes a page and does not go with --json", kWrongUsage);
  const bool isOfDevice = arguments.preview || !arguments.day.empty();
  const auto file = isOfDevice ? std::nullopt : takeFile(arguments.words);
  std::optional<DayNumber> day;
  if (!file || arguments.raw || arguments.identifiability) {
    if (!tool.hasUsableRoot()) return;
  }
  if (!arguments.day.empty()) {
    day = tool.dayOf(arguments.day);
    if (!day) return;
  }
  const auto found = file                ? readFile(tool, *file)
                     : arguments.preview ? buildPreview(tool, day)
                                         : readKept(tool, day);
  if (!file && !tool.hasReadAll()) return;
  if (!found) return tool.fail(found.reason());
  const auto whole = DailyReport::decode(found->root);
  if (!whole) return tool.fail(whole.reason());
  const PlistValue root = selectedKeys(found->root, arguments.words);
  const auto report = DailyReport::decode(root);
  if (!arguments.words.empty() && !arguments.raw && !hasSelectedKeys(*report))
    return tool.fail("no file and no key of the report has that name or has it in it: " +
                     arguments.words.front());

  if (arguments.html) return writePage(tool, arguments, *report);
  if (!tool.options.json) tool.mayPage();
  if (arguments.raw && tool.options.json) return showStories(tool, *whole, arguments.words);
  if (arguments.identifiability && tool.options.json) return showIdentifiability(tool, *report);
  if (tool.printedAsJson(root)) return;
  Terminal& out = tool.out();
  if (arguments.raw || arguments.identifiability) {
    printReportHead(out, *report, titleOf(tool, arguments, *report), found->file);
    arguments.raw ? showStories(tool, *whole, arguments.words) : showIdentifiability(tool, *report);
    return;
  }
  printReport(out, *report, titleOf(tool, arguments, *report), found->file);
  if (!arguments.preview) return;
  const auto logs = otherLogs(tool.platform());
  logs ? printOtherLogs(out, *logs) : tool.fail(logs.reason());
}

}  // namespace

void addReportCommand(CLI::App& app, Tool& tool) {
  CLI::App* command =
      app.add_subcommand("report", "Show a daily report: the newest one, that of a day or of a file");
  auto arguments = std::make_shared<ReportArguments>();
  command->add_option("FILE", arguments->words,
                      "A report's file (- is standard input), then words: only keys that have one of them in "
                      "their names");
  command->add_flag("--preview", arguments->preview,
                    "Show what would leave the device now, and the other logs; submits and changes nothing");
  command
      ->add_option("--day", arguments->day,
                   std::string("The report, or preview, of this day: ") + kDayArgumentHelp)
      ->type_name("DAY");
  CLI::Option* raw =
      command->add_flag("--raw", arguments->raw,
                        "Show what was recorded beside what is reported, with the rule, and what "
                        "stays here, with the reason");
  CLI::Option* identifiability =
      command
          ->add_flag(
              "--identifiability", arguments->identifiability,
              "Show how many different values each key can have at most, and what else the report says")
          ->excludes(raw);
  command
      ->add_option("--html", arguments->html,
                   "Write the report to this file, as a page for a browser that needs nothing else; - is "
                   "standard output")
      ->type_name("FILE")
      ->excludes(raw)
      ->excludes(identifiability);
  command->callback([&tool, arguments] { show(tool, *arguments); });
}

}  // namespace tbdaily

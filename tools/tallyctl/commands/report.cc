// tallyctl report: shows a daily report, or the one that would leave the device.

#include <CLI/CLI.hpp>
#include <optional>
#include <span>

#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/input_file.h"
#include "tools/tallyctl/output_file.h"
#include "tools/tallyctl/page/report_page.h"
#include "tools/tallyctl/report/daily_report.h"
#include "tools/tallyctl/report/kept_reports.h"
#include "tools/tallyctl/report/preview.h"
#include "tools/tallyctl/report/view.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

// Where the page goes that is written in place of the view; none where the view is wanted.
struct PageWish {
  std::optional<std::string> file;
  ReportStanding standing;
};

void writePage(Tool& tool, const DailyReport& report, const PageWish& wish) {
  const std::string page = reportPage(report, wish.standing);
  const auto written = writeOutputFile(*wish.file, std::as_bytes(std::span(page)));
  if (!written) return tool.fail(written.reason());
  if (*wish.file != "-") tool.out().line("wrote " + std::to_string(page.size()) + " bytes to " + *wish.file);
}

void show(Tool& tool, const PlistValue& root, const PageWish& page) {
  const auto report = DailyReport::decode(root);
  if (!report) return tool.fail(report.reason());
  if (page.file) return writePage(tool, *report, page);
  if (!tool.printedAsJson(root)) printReport(tool.out(), *report);
}

void showNewest(Tool& tool, const PageWish& page) {
  if (!tool.hasUsableRoot()) return;
  const DeviceFiles& files = tool.platform().host().files();
  const auto reports = keptReports(files, ReportFolders::All);
  if (!reports) return tool.fail(reports.reason());
  if (reports->empty()) {
    return tool.fail("there is no report yet in " + files.root().native() +
                     "; run tbdaily -f, or look at what it would write with --preview");
  }
  const auto report =
      readKeptReport(files, tool.platform().services().propertyListCodec, reports->back().path);
  report ? show(tool, *report, page) : tool.fail(report.reason());
}

void showFile(Tool& tool, const std::string& file, const PageWish& page) {
  const auto report = readPlistFile(tool.platform().services().propertyListCodec, file);
  report ? show(tool, *report, page) : tool.fail(report.reason());
}

void showPreview(Tool& tool, const std::string& dayText, const PageWish& page) {
  if (!tool.hasUsableRoot()) return;
  std::optional<DayNumber> day;
  if (!dayText.empty()) {
    day = tool.dayOf(dayText);
    if (!day) return;
  }
  const auto preview = previewReport(tool.platform(), day);
  if (!tool.hasReadAll()) return;
  preview ? show(tool, *preview, page) : tool.fail(preview.reason());
}

}  // namespace

void addReportCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("report", "Show a daily report: the newest one, or that of a file");
  auto file = std::make_shared<std::string>();
  auto preview = std::make_shared<bool>(false);
  auto day = std::make_shared<std::string>();
  CLI::Option* fileOption = command->add_option("FILE", *file, "A report; - is standard input");
  CLI::Option* previewOption = command->add_flag(
      "--preview", *preview, "Show what would leave the device now; submits and changes nothing");
  previewOption->excludes(fileOption);
  command
      ->add_option("--day", *day,
                   std::string("With --preview: ") + kDayArgumentHelp + " (default: yesterday)")
      ->type_name("DAY")
      ->needs(previewOption);
  auto html = std::make_shared<std::optional<std::string>>();
  command
      ->add_option("--html", *html,
                   "Write the report to this file, as a page for a browser; - is standard output")
      ->type_name("FILE");
  command->callback([&tool, file, preview, day, html] {
    if (tool.options.json && *html)
      return tool.fail("--html writes a page and does not go with --json", kWrongUsage);
    const PageWish page{*html, *preview ? ReportStanding::Preview : ReportStanding::Written};
    if (*preview) return showPreview(tool, *day, page);
    file->empty() ? showNewest(tool, page) : showFile(tool, *file, page);
  });
}

}  // namespace tbdaily

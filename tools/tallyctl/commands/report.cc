// tallyctl report: shows a daily report, or the one that would leave the device.

#include <CLI/CLI.hpp>
#include <filesystem>

#include "platform/linux/log_spool.h"
#include "tools/tallyctl/input_file.h"
#include "tools/tallyctl/report_preview.h"
#include "tools/tallyctl/report_view.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace fs = std::filesystem;

namespace {

constexpr std::string_view kReportPrefix = "log-tallyd-";
constexpr std::string_view kReportExtension = ".193";
constexpr std::size_t kStampLength = sizeof("2026-11-24-090704") - 1;

// Sorts by the time in the name, then by the number behind it.
using ReportAge = std::pair<std::string, unsigned long>;

void considerFolder(const fs::path& folder, ReportAge& newestAge, fs::path& newest) {
  std::error_code error;
  for (fs::directory_iterator it(folder, error); !error && it != fs::directory_iterator();
       it.increment(error)) {
    const std::string name = it->path().filename().native();
    if (!name.starts_with(kReportPrefix) || !name.ends_with(kReportExtension)) continue;
    const std::string rest = name.substr(kReportPrefix.size());
    if (rest.size() <= kStampLength) continue;
    const ReportAge age{rest.substr(0, kStampLength),
                        std::strtoul(rest.c_str() + kStampLength + 1, nullptr, 10)};
    if (!newest.empty() && age <= newestAge) continue;
    newestAge = age;
    newest = it->path();
  }
}

// The newest report that waits or was handed over; empty when there is none.
fs::path newestReport(Tool& tool) {
  LinuxPlatform& platform = tool.platform();
  const LogSpool spool(platform.host(), platform.services().propertyListCodec);
  ReportAge age;
  fs::path newest;
  considerFolder(spool.pending(), age, newest);
  std::error_code error;
  for (fs::directory_iterator it(spool.outbox(), error); !error && it != fs::directory_iterator();
       it.increment(error)) {
    considerFolder(it->path(), age, newest);
  }
  return newest;
}

void show(Tool& tool, const PlistValue& report) {
  if (report.asDictionary() == nullptr)
    return tool.fail("this is no daily report: its root is no dictionary");
  if (!tool.printedAsJson(report)) printReport(tool.out(), *report.asDictionary());
}

void showFile(Tool& tool, std::string file) {
  if (file.empty()) {
    file = newestReport(tool).native();
    if (file.empty()) {
      if (!tool.hasUsableRoot()) return;
      return tool.fail("there is no report yet in " + tool.platform().host().root().native() +
                       "; run tbdaily -f, or look at what it would write with --preview");
    }
  }
  const auto report = readPlistFile(tool.platform().services().propertyListCodec, file);
  report ? show(tool, *report) : tool.fail(report.reason());
}

void showPreview(Tool& tool, std::optional<DayNumber> day) {
  if (!tool.hasUsableRoot()) return;
  const auto preview = previewReport(tool.platform(), day);
  preview ? show(tool, *preview) : tool.fail(preview.reason());
}

}  // namespace

void addReportCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("report", "Show a daily report: the newest one, or that of a file");
  auto file = std::make_shared<std::string>();
  auto preview = std::make_shared<bool>(false);
  auto day = std::make_shared<std::optional<DayNumber>>();
  CLI::Option* fileOption = command->add_option("FILE", *file, "A report; - is standard input");
  CLI::Option* previewOption = command->add_flag(
      "--preview", *preview, "Show what would leave the device now; submits and changes nothing");
  previewOption->excludes(fileOption);
  command->add_option("--day", *day, "With --preview: days since 1970-01-01 (default: yesterday)")
      ->type_name("N")
      ->needs(previewOption);
  command->callback(
      [&tool, file, preview, day] { *preview ? showPreview(tool, *day) : showFile(tool, *file); });
}

}  // namespace tbdaily

// tallyctl report: shows a daily report, or the one that would leave the device.

#include <CLI/CLI.hpp>
#include <cerrno>
#include <optional>
#include <utility>
#include <vector>

#include "platform/linux/base/host_notes.h"
#include "platform/linux/log_spool.h"
#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/input_file.h"
#include "tools/tallyctl/report_preview.h"
#include "tools/tallyctl/report_view.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

constexpr std::string_view kReportPrefix = "log-tallyd-";
constexpr std::string_view kReportExtension = ".193";
// What every report holds, and nothing else that the job writes or reads.
constexpr std::string_view kReportKeys[] = {"TBCrashLogVersion", "TBStartDate"};
constexpr std::size_t kStampLength = sizeof("2026-11-24-090704") - 1;

// Sorts by the time in the name, then by the number behind it.
using ReportAge = std::pair<std::string, unsigned long>;

std::optional<ReportAge> ageOf(std::string_view name) {
  if (!name.starts_with(kReportPrefix) || !name.ends_with(kReportExtension)) return std::nullopt;
  const std::string rest(name.substr(kReportPrefix.size()));
  if (rest.size() <= kStampLength) return std::nullopt;
  return ReportAge{rest.substr(0, kStampLength), std::strtoul(rest.c_str() + kStampLength + 1, nullptr, 10)};
}

// The newest report of several folders.
class NewestReport {
 public:
  explicit NewestReport(const DeviceFiles& files) : files_(files) {}

  // A folder that is missing holds none.
  Outcome<Nothing> consider(const std::string& folder) { return consider(folder, Files::Refused); }
  // Files beside the folders are passed over.
  Outcome<Nothing> considerFoldersIn(const std::string& folder) {
    auto names = namesIn(folder, Files::Refused);
    if (!names) return Failure{names.reason()};
    for (const std::string& name : *names) {
      if (auto considered = consider(std::string(folder).append("/").append(name), Files::Skipped);
          !considered)
        return considered;
    }
    return Nothing{};
  }

  const std::string& path() const { return path_; }  // on the device; empty when there is none

 private:
  enum class Files : bool { Refused, Skipped };  // what stands in a folder's place

  Outcome<Nothing> consider(const std::string& folder, Files files) {
    auto names = namesIn(folder, files);
    if (!names) return Failure{names.reason()};
    for (const std::string& name : *names) {
      const auto age = ageOf(name);
      if (!age || (!path_.empty() && *age <= age_)) continue;
      age_ = *age;
      path_.assign(folder).append("/").append(name);
    }
    return Nothing{};
  }
  Outcome<std::vector<std::string>> namesIn(const std::string& path, Files files) const {
    DeviceFolder folder;
    std::vector<std::string> names;
    int error = files_.openFolder(path, folder);
    if (error == ENOENT || (error == ENOTDIR && files == Files::Skipped)) return names;
    if (error == 0) error = folder.names(names);
    if (error != 0) return Failure{files_.place(path).native() + ": " + errorText(error)};
    return names;
  }

  const DeviceFiles& files_;
  ReportAge age_;
  std::string path_;
};

// The newest report that waits, is withheld or was handed over.
Outcome<std::string> newestReport(const DeviceFiles& files) {
  const auto folder = [](std::string_view name) {
    return std::string(LogSpool::kFolder).append("/").append(name);
  };
  NewestReport newest(files);
  for (const std::string_view name : {LogSpool::kPending, LogSpool::kWithheld}) {
    if (auto considered = newest.consider(folder(name)); !considered) return Failure{considered.reason()};
  }
  if (auto considered = newest.considerFoldersIn(folder(LogSpool::kOutbox)); !considered)
    return Failure{considered.reason()};
  return newest.path();
}

void show(Tool& tool, const PlistValue& report) {
  if (report.asDictionary() == nullptr)
    return tool.fail("this is no daily report: its root is no dictionary");
  for (const std::string_view key : kReportKeys) {
    if (!report.asDictionary()->contains(key))
      return tool.fail("this is no daily report: it has no \"" + std::string(key) + "\"");
  }
  if (!tool.printedAsJson(report)) printReport(tool.out(), *report.asDictionary());
}

void showNewest(Tool& tool) {
  if (!tool.hasUsableRoot()) return;
  const DeviceFiles& files = tool.platform().host().files();
  const auto path = newestReport(files);
  if (!path) return tool.fail(path.reason());
  if (path->empty()) {
    return tool.fail("there is no report yet in " + files.root().native() +
                     "; run tbdaily -f, or look at what it would write with --preview");
  }
  FileContents contents;
  const std::string shown = files.place(*path).native();
  if (const int error = files.readFile(*path, contents, kLargestPlistInput); error != 0)
    return tool.fail(inputFailure(shown, error, kLargestPlistInput).reason);
  const PlistParseResult report = tool.platform().services().propertyListCodec.parse(contents.bytes);
  report.error.empty() ? show(tool, report.value) : tool.fail(shown + ": " + report.error);
}

void showFile(Tool& tool, const std::string& file) {
  const auto report = readPlistFile(tool.platform().services().propertyListCodec, file);
  report ? show(tool, *report) : tool.fail(report.reason());
}

void showPreview(Tool& tool, const std::string& dayText) {
  if (!tool.hasUsableRoot()) return;
  std::optional<DayNumber> day;
  if (!dayText.empty()) {
    day = tool.dayOf(dayText);
    if (!day) return;
  }
  const auto preview = previewReport(tool.platform(), day);
  if (!tool.hasReadAll()) return;
  preview ? show(tool, *preview) : tool.fail(preview.reason());
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
  command->callback([&tool, file, preview, day] {
    if (*preview) return showPreview(tool, *day);
    file->empty() ? showNewest(tool) : showFile(tool, *file);
  });
}

}  // namespace tbdaily

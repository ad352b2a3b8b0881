#include "tools/tallyctl/report/kept_reports.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <tuple>

#include "platform/linux/base/host_notes.h"
#include "platform/linux/log_spool.h"
#include "tools/tallyctl/input_file.h"

namespace tbdaily {

namespace {

constexpr std::string_view kReportPrefix = "log-tallyd-";
constexpr std::string_view kReportExtension = ".193";
constexpr std::size_t kStampLength = sizeof("2026-11-24-090704") - 1;

std::string below(std::string_view folder, std::string_view name) {
  return std::string(folder).append("/").append(name);
}

class Search {
 public:
  explicit Search(const DeviceFiles& files) : files_(files) {}

  enum class Files : bool { Refused, Skipped };  // what stands in a folder's place

  Outcome<Nothing> addFrom(const std::string& folder, Files files) {
    auto names = namesIn(folder, files);
    if (!names) return Failure{names.reason()};
    for (const std::string& name : *names) {
      if (!name.starts_with(kReportPrefix) || !name.ends_with(kReportExtension)) continue;
      const std::string rest = name.substr(kReportPrefix.size());
      if (rest.size() <= kStampLength) continue;
      found_.push_back({below(folder, name), rest.substr(0, kStampLength),
                        std::strtoul(rest.c_str() + kStampLength + 1, nullptr, 10)});
    }
    return Nothing{};
  }
  // Files beside the folders are passed over.
  Outcome<Nothing> addFromFoldersIn(const std::string& folder) {
    auto names = namesIn(folder, Files::Refused);
    if (!names) return Failure{names.reason()};
    for (const std::string& name : *names) {
      if (auto added = addFrom(below(folder, name), Files::Skipped); !added) return added;
    }
    return Nothing{};
  }
  std::vector<KeptReport> take() {
    std::ranges::sort(found_, {}, [](const KeptReport& report) {
      return std::tuple(std::string_view(report.stamp), report.number, std::string_view(report.path));
    });
    return std::move(found_);
  }

 private:
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
  std::vector<KeptReport> found_;
};

}  // namespace

Outcome<std::vector<KeptReport>> keptReports(const DeviceFiles& files, ReportFolders folders) {
  Search search(files);
  for (const std::string_view name : {LogSpool::kPending, LogSpool::kWithheld}) {
    if (name == LogSpool::kWithheld && folders == ReportFolders::Leaving) continue;
    if (auto added = search.addFrom(below(LogSpool::kFolder, name), Search::Files::Refused); !added)
      return Failure{added.reason()};
  }
  if (auto added = search.addFromFoldersIn(below(LogSpool::kFolder, LogSpool::kOutbox)); !added)
    return Failure{added.reason()};
  return search.take();
}

Outcome<PlistValue> readKeptReport(const DeviceFiles& files, PropertyListCodec& codec,
                                   const std::string& path) {
  FileContents contents;
  const std::string shown = files.place(path).native();
  if (const int error = files.readFile(path, contents, kLargestPlistInput); error != 0)
    return Failure{inputFailure(shown, error, kLargestPlistInput).reason};
  PlistParseResult report = codec.parse(contents.bytes);
  if (!report.error.empty()) return Failure{shown + ": " + report.error};
  return std::move(report.value);
}

}  // namespace tbdaily

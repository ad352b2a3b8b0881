// The files that reports are exported from: each read once, one at a time, with where it comes from.
#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/linux/linux_platform.h"
#include "platform/plist_value.h"
#include "tools/tallyctl/export/report_rows.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

// The name of the device root that a path leads through to its logs: "d7" of
// "/fleet/d7/var/mobile/Library/Logs/Pending/x.193". Empty for a path elsewhere, and for the root "/". A
// relative path begins in the folder.
std::string deviceOfPath(std::string_view path, std::string_view folder);

struct ReportFile {
  std::string name;  // for messages
  PlistValue root;
  ReportOrigin origin;
  // Where the description beside it is there and cannot be read, in one line. Its identifier is then made
  // from the report's bytes, as without a description.
  std::string descriptionFault;
};

// Takes one file after the other, or why one cannot be read, which names it; false ends the reading. `bytes`
// is how much was read so far.
using ReportVisitor = std::function<bool(const Outcome<ReportFile>& file, std::size_t bytes)>;

class ReportFiles {
 public:
  // Borrows the platform. `device` takes the place of what the files' places say.
  ReportFiles(LinuxPlatform& platform, std::optional<std::string> device);

  // Files of the host; "-" is standard input.
  void visit(std::span<const std::string> paths, const ReportVisitor& visitor);
  // Those that a file names, line by line, empty lines left out; "-" is standard input.
  Outcome<Nothing> visitListed(const std::string& list, const ReportVisitor& visitor);
  // The device's own that wait or were handed over, the oldest first.
  Outcome<Nothing> visitKept(const ReportVisitor& visitor);

 private:
  using Read = std::function<int(const std::string& path, FileContents& contents, std::size_t maximum)>;

  Outcome<ReportFile> read(const std::string& path, const std::string& name, const Read& read);
  Outcome<ReportFile> readStandardInput();
  Outcome<ReportFile> parsed(std::span<const std::byte> bytes, const std::string& name,
                             std::optional<std::string> id);
  Outcome<ReportFile> readFromHost(const std::string& path);

  LinuxPlatform& platform_;
  const std::optional<std::string> device_;
  const std::string folder_;  // where relative paths begin
  std::size_t bytes_ = 0;
  FileContents contents_, description_;  // of the file at hand: its memory serves the next one
};

}  // namespace tbdaily

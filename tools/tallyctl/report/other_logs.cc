#include "tools/tallyctl/report/other_logs.h"

#include <algorithm>
#include <cerrno>

#include "platform/calendar.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/log_spool.h"
#include "platform/platform.h"
#include "storage/structured_logs.h"
#include "tools/tallyctl/captured_log.h"
#include "tools/tallyctl/controller_buffer.h"
#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/report/held_services.h"
#include "tools/tallyctl/spool_contents.h"

namespace tbdaily {

namespace {

constexpr std::string_view kStructuredSuffix = ".jsonl";

// What the storage telemetry of a run writes for submission.
void addForeseen(LinuxPlatform& platform, std::vector<OtherLog>& logs) {
  Platform& real = platform.services();
  CapturedLog log;
  QuietDiagnostics quiet;
  ReadOnlyPreferences preferences(real.preferences);
  HeldSubmission submission(real.logSubmission);
  Platform services = platformWith(real, preferences, submission, log, quiet);
  DumpStorageStructuredLog(services, false);
  for (const HeldSubmission::Log& written : submission.logs)
    logs.push_back({OtherLog::State::WouldBeWritten, written.name + ", a log of type " + written.type,
                    written.bytes.size()});
}

// Structured/<type>/<day>.jsonl of days before today.
Outcome<Nothing> addStructured(LinuxPlatform& platform, std::vector<OtherLog>& logs) {
  const DeviceFiles& files = platform.host().files();
  const std::string today = dayText(platform.services().analyticsClient.currentDayNumber());
  const std::string root = std::string(LogSpool::kFolder).append("/").append(LogSpool::kStructured);
  DeviceFolder structured;
  std::vector<std::string> types;
  int error = files.openFolder(root, structured);
  if (error == ENOENT) return Nothing{};
  if (error == 0) error = structured.names(types);
  if (error != 0) return Failure{files.place(root).native() + " cannot be read: " + errorText(error)};
  for (const std::string& type : types) {
    DeviceFolder folder;
    std::vector<std::string> names;
    if (structured.openFolder(type, folder) != 0 || folder.names(names) != 0) continue;
    for (const std::string& name : names) {
      struct stat status {};
      if (!name.ends_with(kStructuredSuffix) ||
          name.substr(0, name.size() - kStructuredSuffix.size()) >= today ||
          folder.status(name, status) != 0 || !S_ISREG(status.st_mode))
        continue;
      logs.push_back({OtherLog::State::WouldBeMoved,
                      std::string(LogSpool::kStructured).append("/").append(type).append("/").append(name),
                      static_cast<std::uint64_t>(status.st_size)});
    }
  }
  return Nothing{};
}

}  // namespace

Outcome<std::vector<OtherLog>> otherLogs(LinuxPlatform& platform) {
  std::vector<OtherLog> logs;
  const auto spool = readSpool(platform.host(), platform.services().propertyListCodec);
  if (!spool) return Failure{spool.reason()};
  for (const SpoolPart& part : spool->parts) {
    if (part.name == "withheld") continue;
    for (const SpooledLog& log : part.logs)
      logs.push_back({OtherLog::State::Waits, log.folder + "/" + log.name, log.bytes});
  }
  addForeseen(platform, logs);
  if (auto added = addStructured(platform, logs); !added) return Failure{added.reason()};
  return logs;
}

}  // namespace tbdaily

// The folders of var/mobile/Library/Logs/: logs that wait for submission (Pending/), what was handed over
// (Outbox/), structured data by type and day (Structured/), and the Carewell logs. One lock file serialises
// the processes that change them.
#pragma once

#include <filesystem>
#include <string>
#include <string_view>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host.h"
#include "platform/log_submission.h"
#include "platform/property_list_codec.h"

namespace tbdaily {

class LogSpool {
 public:
  LogSpool(const Host& host, PropertyListCodec& codec) : host_(host), codec_(codec) {}

  // Pending/<name>-<YYYY-MM-DD-HHMMSS>-<n>.<type> and <the same>.meta.plist: both or neither, the log last.
  bool writePending(std::string_view type, std::string_view name, const PlistValue& options, PlistDate now,
                    const LogWriter& writer);

  // One line of JSON to Structured/<type>/<YYYY-MM-DD>.jsonl, in one write.
  void appendStructured(int type, const PlistDictionary& data, PlistDate now);

  // Moves the structured files of days before today to Pending/structured-<type>-<YYYY-MM-DD>.jsonl; where a
  // file of that name still waits there, "-1", "-2" ... follows the date.
  void dumpOldStructured(PlistDate now);

  // Moves all of Pending/ to a new Outbox/<YYYY-MM-DD-HHMMSS>-<n>/; nothing when nothing is pending.
  void submitPending(PlistDate now);

  // Carewell/x.log to x.log.1, x.log.1 to x.log.2 and so on, keeping five.
  void rollCarewell();

  std::filesystem::path folder() const { return host_.devicePath("/var/mobile/Library/Logs"); }
  std::filesystem::path pending() const { return folder() / "Pending"; }
  std::filesystem::path outbox() const { return folder() / "Outbox"; }

 private:
  int lockSpool(FileLock& lock) const;

  const Host& host_;
  PropertyListCodec& codec_;
};

// "2026-11-24-090704", UTC.
std::string spoolStamp(PlistDate now);

}  // namespace tbdaily

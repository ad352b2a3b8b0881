// The folders of var/mobile/Library/Logs/: logs that wait for submission (Pending/), logs that nobody agreed
// to send (Withheld/), what was handed over (Outbox/), structured data by type and day (Structured/), and the
// Carewell logs. One lock file serialises the processes that change them.
#pragma once

#include <map>
#include <mutex>
#include <string>
#include <string_view>

#include "platform/linux/base/host.h"
#include "platform/linux/base/passing_file.h"
#include "platform/log_submission.h"
#include "platform/property_list_codec.h"

namespace tbdaily {

// Whether logs may leave this device.
enum class Consent : bool { No, Yes };

class LogSpool {
 public:
  static constexpr std::string_view kFolder = "/var/mobile/Library/Logs";
  static constexpr std::string_view kPending = "Pending";    // leaves with the next submission
  static constexpr std::string_view kWithheld = "Withheld";  // written without consent: stays
  static constexpr std::string_view kOutbox = "Outbox";
  static constexpr std::string_view kStructured = "Structured";  // of each type and day: not a log yet
  static constexpr const char* kLockFile = ".lock";  // in kFolder: whoever changes one of these holds it

  LogSpool(const Host& host, PropertyListCodec& codec) : host_(host), codec_(codec) {}

  // <name>-<YYYY-MM-DD-HHMMSS>-<n>.<type> and <the same>.meta.plist, in Pending/ or, without consent, in
  // Withheld/: both or neither, the log last.
  bool writeLog(Consent consent, std::string_view type, std::string_view name, const PlistValue& options,
                PlistDate now, const LogWriter& writer);

  // One line of JSON to Structured/<type>/<YYYY-MM-DD>.jsonl, in one write.
  void appendStructured(int type, const PlistDictionary& data, PlistDate now);

  // Moves the structured files of days before today to structured-<type>-<YYYY-MM-DD>.jsonl in Pending/ or
  // Withheld/; where a file of that name still waits there, "-1", "-2" ... follows the date.
  void dumpOldStructured(Consent consent, PlistDate now);

  // Moves all of Pending/ to a new Outbox/<YYYY-MM-DD-HHMMSS>-<n>/; nothing when nothing is pending.
  void submitPending(PlistDate now);

  // Carewell/x.log to x.log.1, x.log.1 to x.log.2 and so on, keeping five.
  void rollCarewell();

 private:
  // The folder of all logs, made, and its lock.
  int lockSpool(DeviceFolder& folder, FileLock& lock) const;
  int moveOldStructured(const DeviceFolder& from, const std::string& type, std::string_view today,
                        const DeviceFolder& to);
  void noteFailure(std::string_view folder, int error) const;
  int openStructured(int type, const std::string& day);
  int appendLine(int type, const std::string& day, std::string_view line);

  const Host& host_;
  PropertyListCodec& codec_;

  // Lines come in crowds: the file that a type was last written to stays open, and the lock file.
  struct StructuredFile {
    std::string day;
    FileDescriptor file;
  };
  std::mutex mutex_;  // over what follows
  FileDescriptor lockFile_;
  std::map<int, StructuredFile> structured_;
};

// "2026-11-24-090704", UTC.
std::string spoolStamp(PlistDate now);

}  // namespace tbdaily

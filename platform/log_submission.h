// Diagnostic logs and structured data logs.
//
// Absent service: writing answers false, submission is disabled, texts are empty, everything else does
// nothing.
#pragma once

#include <cstddef>
#include <functional>
#include <span>
#include <string>
#include <string_view>

#include "platform/plist_value.h"

namespace tbdaily {

// The open output file of one log, valid during the writer's call.
class LogOutput {
 public:
  virtual ~LogOutput() = default;
  // Appends all of the bytes, or answers false.
  virtual bool write(std::span<const std::byte> bytes) = 0;
};

// Answers whether the log is whole; false leaves no log behind.
using LogWriter = std::function<bool(LogOutput&)>;

class LogSubmission {
 public:
  virtual ~LogSubmission() = default;

  // `logType` is decimal text; `options` is a dictionary or none; `extra` is always passed as none. The
  // writer is called before this returns, unless the log cannot be opened. Answers whether the log was
  // written.
  virtual bool writeLogForSubmission(std::string_view logType, std::string_view logName,
                                     const PlistValue& options, const PlistValue& extra,
                                     const LogWriter& writer) = 0;
  virtual void logStructuredData(int type, const PlistDictionary& data) = 0;
  virtual bool isDiagnosticLogSubmissionEnabled() = 0;
  virtual void dumpAllOldStructuredDataLogs() = 0;
  virtual void rollCarewellLogs() = 0;
  virtual void submitDiagnosticLogs() = 0;
  virtual PlistValue taskingValue(std::string_view key) = 0;
  virtual std::string currentOSVersion() = 0;
  virtual std::string systemIdentifier() = 0;
  virtual std::string hardwareModel() = 0;
  virtual std::string systemVersion() = 0;
  virtual std::string incidentIdentifier() = 0;  // a new one for each call
};

}  // namespace tbdaily

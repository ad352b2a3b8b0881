// Services that let the job's own code work without anything happening: for looking at what it would do.
#pragma once

#include <string>
#include <vector>

#include "platform/log_submission.h"
#include "platform/preferences_store.h"

namespace tbdaily {

class ReadOnlyPreferences : public PreferencesStore {
 public:
  explicit ReadOnlyPreferences(PreferencesStore& real) : real_(real) {}
  PlistValue getValue(std::string_view key, std::string_view domain) override {
    return real_.getValue(key, domain);
  }
  void setValue(std::string_view, const PlistValue&, std::string_view) override {}
  void synchronize(std::string_view) override {}

 private:
  PreferencesStore& real_;
};

// Keeps the logs that are written, and lets nothing else happen.
class HeldSubmission : public LogSubmission {
 public:
  struct Log : LogOutput {
    bool write(std::span<const std::byte> data) override {
      bytes.insert(bytes.end(), data.begin(), data.end());
      return true;
    }
    std::string type, name;
    std::vector<std::byte> bytes;
  };

  explicit HeldSubmission(LogSubmission& real) : real_(real) {}
  bool writeLogForSubmission(std::string_view type, std::string_view name, const PlistValue&,
                             const PlistValue&, const LogWriter& writer) override {
    Log log;
    log.type = type;
    log.name = name;
    if (!writer(log)) return false;
    logs.push_back(std::move(log));
    return true;
  }
  void logStructuredData(int, const PlistDictionary&) override {}
  bool isDiagnosticLogSubmissionEnabled() override { return real_.isDiagnosticLogSubmissionEnabled(); }
  void dumpAllOldStructuredDataLogs() override {}
  void rollCarewellLogs() override {}
  void submitDiagnosticLogs() override {}
  PlistValue taskingValue(std::string_view key) override { return real_.taskingValue(key); }
  std::string currentOSVersion() override { return real_.currentOSVersion(); }
  std::string systemIdentifier() override { return real_.systemIdentifier(); }
  std::string hardwareModel() override { return real_.hardwareModel(); }
  std::string systemVersion() override { return real_.systemVersion(); }
  std::string incidentIdentifier() override { return real_.incidentIdentifier(); }

  std::vector<Log> logs;

 private:
  LogSubmission& real_;
};

}  // namespace tbdaily

// A log submission service that keeps what it is given in memory.
#pragma once

#include <string>
#include <vector>

#include "platform/log_submission.h"

namespace tbdaily::testing {

class FakeLogSubmission : public LogSubmission {
 public:
  struct Log {
    std::string type, name, bytes;
    PlistValue options;
  };

  bool writeLogForSubmission(std::string_view logType, std::string_view logName, const PlistValue& options,
                             const PlistValue& extra, const LogWriter& writer) override {
    calls.emplace_back("write");
    Output output(writeFails);
    if (!extra.isNone() || !writer(output) || writeFails) return false;
    logs.push_back({std::string(logType), std::string(logName), output.bytes, options});
    return true;
  }
  void logStructuredData(int type, const PlistDictionary& data) override {
    structured.emplace_back(type, data);
  }
  bool isDiagnosticLogSubmissionEnabled() override {
    calls.emplace_back("enabled?");
    return enabled;
  }
  void dumpAllOldStructuredDataLogs() override { calls.emplace_back("dump"); }
  void rollCarewellLogs() override { calls.emplace_back("roll"); }
  void submitDiagnosticLogs() override { calls.emplace_back("submit"); }
  PlistValue taskingValue(std::string_view key) override { return taskingValues.get(key); }
  std::string currentOSVersion() override { return osVersion; }
  std::string systemIdentifier() override { return identifier; }
  std::string hardwareModel() override { return model; }
  std::string systemVersion() override { return version; }
  std::string incidentIdentifier() override { return "incident-" + std::to_string(++incidents); }

  bool enabled = false;
  bool writeFails = false;
  PlistDictionary taskingValues;
  std::string osVersion, identifier, model, version;
  std::vector<std::string> calls;
  std::vector<Log> logs;
  std::vector<std::pair<int, PlistDictionary>> structured;

 private:
  struct Output : LogOutput {
    explicit Output(bool failing) : fails(failing) {}
    bool write(std::span<const std::byte> data) override {
      if (!fails) bytes.append(reinterpret_cast<const char*>(data.data()), data.size());
      return !fails;
    }
    bool fails;
    std::string bytes;
  };
  int incidents = 0;
};

}  // namespace tbdaily::testing

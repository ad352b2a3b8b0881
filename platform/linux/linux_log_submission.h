// Log submission on the spool folders, the preferences and the host's identity.
#pragma once

#include "platform/kernel.h"
#include "platform/linux/log_spool.h"
#include "platform/linux/replay/recordings.h"
#include "platform/log_submission.h"
#include "platform/preferences_store.h"

namespace tbdaily {

class LinuxLogSubmission : public LogSubmission {
 public:
  LinuxLogSubmission(const Host& host, Recordings& recordings, PropertyListCodec& codec,
                     PreferencesStore& preferences, Kernel& kernel)
      : host_(host),
        recordings_(recordings),
        preferences_(preferences),
        kernel_(kernel),
        spool_(host, codec) {}

  bool writeLogForSubmission(std::string_view logType, std::string_view logName, const PlistValue& options,
                             const PlistValue& extra, const LogWriter& writer) override;
  void logStructuredData(int type, const PlistDictionary& data) override;
  bool isDiagnosticLogSubmissionEnabled() override;
  void dumpAllOldStructuredDataLogs() override;
  void rollCarewellLogs() override;
  void submitDiagnosticLogs() override;
  PlistValue taskingValue(std::string_view key) override;
  std::string currentOSVersion() override;
  std::string systemIdentifier() override;
  std::string hardwareModel() override;
  std::string systemVersion() override;
  std::string incidentIdentifier() override;

 private:
  Consent consent();
  std::optional<std::string> recordedText(std::string_view key);

  const Host& host_;
  Recordings& recordings_;
  PreferencesStore& preferences_;
  Kernel& kernel_;
  LogSpool spool_;
};

}  // namespace tbdaily

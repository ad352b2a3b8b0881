#include "platform/linux/linux_log_submission.h"

#include "platform/linux/host_identity.h"
#include "platform/linux/os_release.h"

namespace tbdaily {

bool LinuxLogSubmission::writeLogForSubmission(std::string_view logType, std::string_view logName,
                                               const PlistValue& options, const PlistValue&,
                                               const LogWriter& writer) {
  return spool_.writeLog(consent(), logType, logName, options, kernel_.currentTime(), writer);
}

void LinuxLogSubmission::logStructuredData(int type, const PlistDictionary& data) {
  spool_.appendStructured(type, data, kernel_.currentTime());
}

bool LinuxLogSubmission::isDiagnosticLogSubmissionEnabled() {
  return preferences_.getBoolean(kConsentKey, preference_domain::kLogSubmission).value;
}

Consent LinuxLogSubmission::consent() {
  return isDiagnosticLogSubmissionEnabled() ? Consent::Yes : Consent::No;
}

void LinuxLogSubmission::dumpAllOldStructuredDataLogs() {
  spool_.dumpOldStructured(consent(), kernel_.currentTime());
}
void LinuxLogSubmission::rollCarewellLogs() {
  spool_.rollCarewell();
}
void LinuxLogSubmission::submitDiagnosticLogs() {
  if (isDiagnosticLogSubmissionEnabled()) spool_.submitPending(kernel_.currentTime());
}

PlistValue LinuxLogSubmission::taskingValue(std::string_view key) {
  return preferences_.getValue(key, preference_domain::kTaskingValues);
}

std::optional<std::string> LinuxLogSubmission::recordedText(std::string_view key) {
  const PlistValue value = recordings_.entry(recording::kAnswers, key);
  if (const auto text = value.asString()) return std::string(*text);
  return std::nullopt;
}

std::string LinuxLogSubmission::currentOSVersion() {
  if (const auto recorded = recordedText("ProductVersion")) return *recorded;
  if (!host_.live()) return {};
  const auto version = osReleaseValue(host_, "VERSION_ID");
  return version ? *version
                 : osReleaseValue(host_, "BUILD_ID").value_or("");  // rolling releases have no version
}

std::string LinuxLogSubmission::systemIdentifier() {
  if (const auto recorded = recordedText("SystemIdentifier")) return *recorded;
  return host_.live() ? hashedMachineIdentifier(host_) : "";
}

std::string LinuxLogSubmission::hardwareModel() {
  if (const auto recorded = recordedText("HardwareModel")) return *recorded;
  return host_.live() ? hardwareModelName(host_) : "";
}

std::string LinuxLogSubmission::systemVersion() {
  if (const auto recorded = recordedText("SystemVersion")) return *recorded;
  return host_.live() ? osReleaseValue(host_, "PRETTY_NAME").value_or("") : "";
}

std::string LinuxLogSubmission::incidentIdentifier() {
  return randomUuid();
}

}  // namespace tbdaily

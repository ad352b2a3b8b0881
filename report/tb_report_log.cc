// The second half of the daily report: from the gathered tables to a log for submission.

#include "platform/analytics_client.h"
#include "platform/kernel.h"
#include "platform/log_submission.h"
#include "platform/preferences_store.h"
#include "platform/property_list_codec.h"
#include "platform/system_log.h"
#include "report/tb_report.h"

namespace tbdaily {

namespace {

constexpr std::int64_t kLogVersion = 1;
constexpr std::string_view kLogType = "193";
constexpr std::string_view kLogName = "log-tallyd";

PlistValue valueOr(const PlistValue& value, const PlistValue& substitute) {
  return value.isNone() ? substitute : value;
}

}  // namespace

PlistDictionary TBReport::rootDictionary(DayNumber day, const PlistValue& appInfo,
                                         const std::string& whitelistDigest) {
  const auto tasking = [this](std::string_view key, const PlistValue& substitute) {
    return valueOr(platform_.preferences.getValue(key, preference_domain::kJob), substitute);
  };
  PlistValue taskID = tasking("TaskingID", PlistValue::string("(no tasking id)"));
  PlistValue taskDigest = tasking("TaskingDigest", PlistValue::string("(no tasking digest)"));
  PlistValue payload = tasking("TaskingPayload", PlistValue::array({}));

  PlistDictionary root{
      {"TBCrashLogVersion", PlistValue::int64(kLogVersion)},
      {"TBStartDate", PlistValue(platform_.analyticsClient.dateOfDayNumber(day))},
      {"TBLogCreationDate", PlistValue(platform_.kernel.currentTime())},
      {"TBMetadata", PlistValue::dictionary(std::move(_metadataOutput))},
      {"TBScalars", PlistValue::dictionary(std::move(_scalarsOutput))},
      {"TBDistributions", PlistValue::dictionary(std::move(_distributionsOutput))},
      {"TBDistributionsHistogram", PlistValue::dictionary(std::move(_histogramsOutput))},
      {"TBTasking", std::move(payload)},
      {"TBTaskID", std::move(taskID)},
      {"TBTaskDigest", std::move(taskDigest)},
      {"TBWhitelistDigest", PlistValue::string(whitelistDigest)},
  };
  root.set("TBActivatedAppInfo", appInfo);
  return root;
}

PlistValue TBReport::noteOSVersion() {
  const PlistValue stored = platform_.preferences.getValue("LastOSVersion", preference_domain::kJob);
  const std::optional<std::string_view> previous = stored.asString();
  const std::string current = platform_.logSubmission.currentOSVersion();
  if (previous == current) return {};
  platform_.preferences.setValue("LastOSVersion", PlistValue::string(current), preference_domain::kJob);
  platform_.preferences.synchronize(preference_domain::kJob);
  return PlistValue::dictionary(
      {{"previous_os_version", PlistValue::string(std::string(previous.value_or("<unknown>")))}});
}

void TBReport::serializeWithDateAndAppInfo(DayNumber day, const PlistValue& appInfo) {
  if (_scalarsOutput.empty() && _distributionsOutput.empty() && _histogramsOutput.empty()) return;
  addInstalledAppInfo();
  addMetadataKeys();
  reportDatabaseSize();
  reportCPUUptime();
  reportVMStats();

  const std::string whitelistDigest = _config != nullptr ? _config->configFileDigest() : "";
  _config.reset();
  const PlistValue root = PlistValue::dictionary(rootDictionary(day, appInfo, whitelistDigest));
  PropertyListCodec& codec = platform_.propertyListCodec;
  if (const std::string fault = codec.whyNotPlain(root); !fault.empty()) {
    platform_.systemLog.message(LogLevel::Error, "Could not create tallyd plist: %@", fault);
    return;
  }
  const PlistValue options = noteOSVersion();
  const bool written = platform_.logSubmission.writeLogForSubmission(
      kLogType, kLogName, options, PlistValue(), [&](LogOutput& file) {
        return codec
            .writeInPieces(root, PlistForm::Plain,
                           [&file](std::span<const std::byte> piece) { return file.write(piece); })
            .ok;
      });
  if (!written) platform_.systemLog.message(LogLevel::Error, "Failed to write tallyd log");
}

}  // namespace tbdaily

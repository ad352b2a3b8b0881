#include "tools/tallyctl/report/preview.h"

#include <fcntl.h>
#include <sys/stat.h>

#include "driver/daily_tasks.h"
#include "driver/environment_probes.h"
#include "platform/analytics_home.h"
#include "platform/file_system.h"
#include "platform/kernel.h"
#include "platform/linux/store/sqlite_analytics_history.h"
#include "platform/linux/store/store_locator.h"
#include "platform/log_submission.h"
#include "platform/platform.h"
#include "platform/preferences_store.h"
#include "platform/property_list_codec.h"
#include "report/tb_report.h"
#include "tools/tallyctl/captured_log.h"
#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/store_copy.h"

namespace tbdaily {

namespace {

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

// Keeps the one log that is written, and lets nothing else happen.
class CapturedSubmission : public LogSubmission {
 public:
  explicit CapturedSubmission(LogSubmission& real) : real_(real) {}
  bool writeLogForSubmission(std::string_view, std::string_view, const PlistValue&, const PlistValue&,
                             const LogWriter& writer) override {
    return writer(output);
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

  struct Output : LogOutput {
    bool write(std::span<const std::byte> data) override {
      bytes.insert(bytes.end(), data.begin(), data.end());
      return true;
    }
    std::vector<std::byte> bytes;
  } output;

 private:
  LogSubmission& real_;
};

// What a run would find: the copy has the size of the store with its log written back, as a run does first.
// Nothing of the device is loaded for the count of damages: it is the preference that the device's library
// keeps it in.
StoreProbes probesOver(const FileDescriptor& copy, Platform& real) {
  return {[&copy]() -> std::int64_t {
            struct stat status {};
            return copy.isOpen() && ::fstat(copy.get(), &status) == 0 ? status.st_size / kBytesPerMiB : -1;
          },
          [&real]() -> std::int64_t {
            const bool isKept = real.fileSystem.status(kSupportLibraryPath).has_value();
            return isKept ? real.preferences.getInteger(kCorruptionCountKey, kCorruptionCountDomain) : 0;
          }};
}

std::string whyNothing(const CapturedLog& log, DayNumber day) {
  const std::vector<std::string> errors = log.errors();
  if (!errors.empty()) return errors.front();
  return "no report would be written: the store holds nothing for " + dayText(day) +
         " that the whitelist allows";
}

}  // namespace

Outcome<PlistValue> previewReport(LinuxPlatform& linux, std::optional<DayNumber> day) {
  Platform& real = linux.services();
  const AnalyticsStoreLocator locate = analyticsStoreLocator(linux.host(), real.analyticsHome);
  OpenedStore opened;
  FileDescriptor file;
  if (const auto place = locate()) {
    auto copy = copyStore(*place);
    if (!copy) return Failure{copy.reason()};
    if (copy->file.isOpen()) {
      file = FileDescriptor(::fcntl(copy->file.get(), F_DUPFD_CLOEXEC, 0));
      opened = openStoreCopy(std::move(copy->file), std::move(copy->log), *place);
      if (!opened.result.ok()) return Failure{opened.result.error};
    }
  }

  CapturedLog log;
  ReadOnlyPreferences preferences(real.preferences);
  CapturedSubmission submission(real.logSubmission);
  SqliteAnalyticsHistory history(locate, [&opened](const StorePlace&) { return std::move(opened); });
  Platform preview = platformWith(real, preferences, submission, history, log);

  const DayNumber wanted = day ? *day : dayBefore(real.analyticsClient.currentDayNumber());
  TBReport(preview, probesOver(file, real)).writeLogForYesterdayWithAppInfo(wanted, PlistValue());
  if (submission.output.bytes.empty()) return Failure{whyNothing(log, wanted)};
  PlistParseResult parsed = real.propertyListCodec.parse(submission.output.bytes);
  if (!parsed.error.empty()) return Failure{std::move(parsed.error)};
  return std::move(parsed.value);
}

}  // namespace tbdaily

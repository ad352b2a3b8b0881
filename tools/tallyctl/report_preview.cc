#include "tools/tallyctl/report_preview.h"

#include "driver/daily_tasks.h"
#include "driver/environment_probes.h"
#include "platform/analytics_home.h"
#include "platform/dynamic_loader.h"
#include "platform/file_system.h"
#include "platform/kernel.h"
#include "platform/linux/store/analytics_store.h"
#include "platform/linux/store/sqlite_analytics_history.h"
#include "platform/log_submission.h"
#include "platform/platform.h"
#include "platform/preferences_store.h"
#include "platform/property_list_codec.h"
#include "report/tb_report.h"
#include "tools/tallyctl/captured_log.h"
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

// Binds the real functions, except that the one that stores does nothing.
class ReadOnlyLoader : public DynamicLoader {
 public:
  explicit ReadOnlyLoader(DynamicLoader& real) : real_(real) {}
  LibraryHandle open(std::string_view path) override { return real_.open(path); }
  void* symbol(LibraryHandle library, const std::string& name) override {
    void* found = real_.symbol(library, name);
    if (found == nullptr || name != "SMXPreferencesSetValue") return found;
    const PreferencesSetValue nothing = [](const char*, std::int64_t, const char*) {};
    return reinterpret_cast<void*>(nothing);
  }

 private:
  DynamicLoader& real_;
};

// Answers for the store's file with the copy, which is as large as the store will be once a run has asked for
// its checkpoint.
class StoreCopyFileSystem : public FileSystem {
 public:
  StoreCopyFileSystem(FileSystem& real, std::string storePath, std::filesystem::path copy)
      : real_(real), storePath_(std::move(storePath)), copy_(std::move(copy)) {}
  std::optional<FileStatus> status(std::string_view path) override {
    if (path != storePath_) return real_.status(path);
    std::error_code error;
    const auto size = std::filesystem::file_size(copy_, error);
    return error ? std::nullopt : std::optional(FileStatus{static_cast<std::int64_t>(size)});
  }
  std::optional<std::vector<std::byte>> readFile(std::string_view path) override {
    return real_.readFile(path);
  }

 private:
  FileSystem& real_;
  std::string storePath_;
  std::filesystem::path copy_;
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

// Brings the copy to the state that the store has once a run has asked for its checkpoint. Why it cannot be
// used, of the store itself; empty when it can, or is missing.
std::string checkpointCopy(const StoreCopy& copy, const std::filesystem::path& store) {
  std::error_code ignored;
  if (!std::filesystem::exists(copy.path(), ignored)) return {};
  std::string error = AnalyticsStore(copy.path()).checkpoint().error;
  const std::size_t place = error.find(copy.path().native());
  return place == std::string::npos ? error
                                    : error.replace(place, copy.path().native().size(), store.native());
}

std::string whyNothing(const CapturedLog& log, DayNumber day) {
  const std::vector<std::string> errors = log.errors();
  if (!errors.empty()) return errors.front();
  return "no report would be written: the store holds nothing for day " + std::to_string(day) +
         " that the whitelist allows";
}

}  // namespace

Outcome<PlistValue> previewReport(LinuxPlatform& linux, std::optional<DayNumber> day) {
  Platform& real = linux.services();
  const std::string* home = real.analyticsHome.find().path;
  const std::string storePath = home != nullptr ? analyticsDatabasePath(*home) : "";
  const StoreCopy copy(home != nullptr ? linux.host().devicePath(storePath) : std::filesystem::path());
  if (!copy.error().empty()) return Failure{copy.error()};
  if (const std::string fault = checkpointCopy(copy, linux.host().devicePath(storePath)); !fault.empty())
    return Failure{fault};

  CapturedLog log;
  ReadOnlyPreferences preferences(real.preferences);
  ReadOnlyLoader loader(real.dynamicLoader);
  StoreCopyFileSystem fileSystem(real.fileSystem, storePath, copy.path());
  CapturedSubmission submission(real.logSubmission);
  SqliteAnalyticsHistory history([&copy] { return std::optional(copy.path()); });
  Platform preview = platformWith(real, preferences, submission, history, log, fileSystem, loader);

  const DayNumber wanted = day ? *day : dayBefore(real.analyticsClient.currentDayNumber());
  TBReport(preview, storeProbes(preview)).writeLogForYesterdayWithAppInfo(wanted, PlistValue());
  if (submission.output.bytes.empty()) return Failure{whyNothing(log, wanted)};
  PlistParseResult parsed = real.propertyListCodec.parse(submission.output.bytes);
  if (!parsed.error.empty()) return Failure{std::move(parsed.error)};
  return std::move(parsed.value);
}

}  // namespace tbdaily

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
#include "platform/platform.h"
#include "platform/property_list_codec.h"
#include "report/tb_report.h"
#include "tools/tallyctl/captured_log.h"
#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/report/held_services.h"
#include "tools/tallyctl/store_copy.h"

namespace tbdaily {

namespace {

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
  HeldSubmission submission(real.logSubmission);
  SqliteAnalyticsHistory history(locate, [&opened](const StorePlace&) { return std::move(opened); });
  Platform preview = platformWith(real, preferences, submission, history, log);

  const DayNumber wanted = day ? *day : dayBefore(real.analyticsClient.currentDayNumber());
  TBReport(preview, probesOver(file, real)).writeLogForYesterdayWithAppInfo(wanted, PlistValue());
  if (submission.logs.empty()) return Failure{whyNothing(log, wanted)};
  PlistParseResult parsed = real.propertyListCodec.parse(submission.logs.front().bytes);
  if (!parsed.error.empty()) return Failure{std::move(parsed.error)};
  return std::move(parsed.value);
}

}  // namespace tbdaily

#include "driver/daily_tasks.h"

#include "driver/device_metrics.h"
#include "driver/environment_probes.h"
#include "driver/step.h"
#include "driver/tasking.h"
#include "platform/file_system.h"
#include "platform/log_submission.h"
#include "platform/preferences_store.h"
#include "platform/run_lock.h"
#include "platform/system_log.h"
#include "report/tb_report.h"

namespace tbdaily {

DayNumber dayBefore(DayNumber day) {
  return static_cast<DayNumber>(static_cast<std::uint32_t>(day) - 1);
}

namespace {

// How long a run waits for another one.
constexpr std::chrono::minutes kPatience(10);

void runTasks(Platform& platform, DayNumber day, const PlistValue& appInfo) {
  platform.systemLog.message(LogLevel::Default, "daily tasks for day %d", day);
  runStep(platform, "the checkpoint", [&] { platform.analyticsClient.checkpoint(); });
  runStep(platform, "the report", [&] {
    if (!platform.logSubmission.isDiagnosticLogSubmissionEnabled()) return;
    TBReport report(platform, storeProbes(platform));
    report.writeLogForYesterdayWithAppInfo(day, appInfo);
  });
  CollectDailyDeviceMetrics(platform);
  runStep(platform, "the dump of old structured data",
          [&] { platform.logSubmission.dumpAllOldStructuredDataLogs(); });
  runStep(platform, "tasking", [&] { HandleTaskingAndOSChange(platform); });
  runStep(platform, "the rotation of logs", [&] { platform.logSubmission.rollCarewellLogs(); });
}

}  // namespace

void RunDailyTasks(Platform& platform, DayNumber day, const PlistValue& appInfo) {
  const std::unique_ptr<HeldRunLock> lock = platform.runLock.acquire(kPatience);
  if (lock == nullptr) return;
  runTasks(platform, day, appInfo);
  runStep(platform, "the way to storage", [&] { platform.fileSystem.makeDurable(); });
}

void RunDailyTasksIfNewDay(Platform& platform, const PlistValue& appInfo) {
  const std::unique_ptr<HeldRunLock> lock = platform.runLock.acquire(kPatience);
  if (lock == nullptr) return;
  PreferencesStore& preferences = platform.preferences;
  const DayNumber yesterday = dayBefore(platform.analyticsClient.currentDayNumber());
  if (preferences.getInteger(kLastProcessedDay, preference_domain::kJob) >= yesterday) {
    platform.systemLog.message(LogLevel::Default, "Day unchanged since last run");
    return;
  }
  runTasks(platform, yesterday, appInfo);
  runStep(platform, "the record of the day", [&] {
    // A day counts as done when all that it wrote would outlive a power cut.
    if (!platform.fileSystem.makeDurable()) return;
    preferences.setValue(kLastProcessedDay, PlistValue::int32(yesterday), preference_domain::kJob);
    preferences.synchronize(preference_domain::kJob);
  });
}

}  // namespace tbdaily

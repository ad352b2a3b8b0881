#include "driver/daily_tasks.h"

#include "driver/device_metrics.h"
#include "driver/environment_probes.h"
#include "driver/tasking.h"
#include "platform/log_submission.h"
#include "platform/preferences_store.h"
#include "platform/system_log.h"
#include "report/tb_report.h"

namespace tbdaily {

namespace {
constexpr std::string_view kLastProcessedDay = "LastCrashLogSerializationDateInDaysSince1970";
}

DayNumber dayBefore(DayNumber day) {
  return static_cast<DayNumber>(static_cast<std::uint32_t>(day) - 1);
}

void RunDailyTasks(Platform& platform, DayNumber day, const PlistValue& appInfo) {
  platform.systemLog.message(LogLevel::Default, "daily tasks for day %d", day);
  platform.analyticsClient.checkpoint();
  if (platform.logSubmission.isDiagnosticLogSubmissionEnabled()) {
    TBReport report(platform, storeProbes(platform));
    report.writeLogForYesterdayWithAppInfo(day, appInfo);
  }
  CollectDailyDeviceMetrics(platform);
  platform.logSubmission.dumpAllOldStructuredDataLogs();
  HandleTaskingAndOSChange(platform);
  platform.logSubmission.rollCarewellLogs();
}

void RunDailyTasksIfNewDay(Platform& platform, const PlistValue& appInfo) {
  PreferencesStore& preferences = platform.preferences;
  const DayNumber yesterday = dayBefore(platform.analyticsClient.currentDayNumber());
  if (preferences.getInteger(kLastProcessedDay, preference_domain::kJob) >= yesterday) {
    platform.systemLog.message(LogLevel::Default, "Day unchanged since last run");
    return;
  }
  RunDailyTasks(platform, yesterday, appInfo);
  preferences.setValue(kLastProcessedDay, PlistValue::int32(yesterday), preference_domain::kJob);
  preferences.synchronize(preference_domain::kJob);
}

}  // namespace tbdaily

#include "driver/entry.h"

#include <string_view>

#include "driver/daily_tasks.h"
#include "driver/service_endpoint.h"
#include "platform/system_log.h"

namespace tbdaily {

namespace {

constexpr double kQuietSeconds = 10.0;

void runListenerMode(Platform& platform) {
  ServiceListener& listener = platform.serviceListener;
  const ServiceConnection endpoint = listener.createListener(kEndpointName, DeliveryQueue::Main);
  if (endpoint != 0) {
    listener.setEventHandler(
        endpoint, [&platform](const ServiceEvent& event) { HandleNewConnection(platform, event); });
    listener.resume(endpoint);
  }
  while (listener.runSlice(kQuietSeconds) != SliceResult::TimedOut) {
  }
  if (gCommandState.gAppInfoRequested) {
    platform.systemLog.message(LogLevel::Default, "never received requested AAI, so moving along without it");
    RunDailyTasksIfNewDay(platform, PlistValue());
  }
}

void runCommandLineMode(Platform& platform, std::string_view argument) {
  const DayNumber today = platform.analyticsClient.currentDayNumber();
  if (argument == "-d") {
    RunDailyTasksIfNewDay(platform, PlistValue());
  } else if (argument == "-f") {
    RunDailyTasks(platform, dayBefore(today), PlistValue());
  } else if (argument == "-t") {
    RunDailyTasks(platform, today, PlistValue());
  } else {
    platform.systemLog.message(LogLevel::Default, "Unknown arg: %s", argument);
  }
}

}  // namespace

int runEntry(Platform& platform, int argumentCount, const char* const* arguments) {
  platform.systemLog.message(LogLevel::Default, "tbdaily started");
  if (argumentCount == 1) {
    runListenerMode(platform);
  } else if (argumentCount >= 2) {
    runCommandLineMode(platform, arguments[1]);
  }
  platform.systemLog.message(LogLevel::Default, "tbdaily ended");
  return 0;
}

}  // namespace tbdaily

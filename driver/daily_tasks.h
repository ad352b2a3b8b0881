// A day's work, in its fixed order.
#pragma once

#include <string_view>

#include "platform/analytics_client.h"
#include "platform/platform.h"
#include "platform/plist_value.h"

namespace tbdaily {

// One run at a time on a device: another one that is at work is waited for, and when it does not end nothing
// is run.
//
// Writes the report of the day, collects the device metrics of the moment, applies tasking and rolls logs.
// `appInfo` is an array of AppInfoRecord, or none. Never fails as a whole: each step logs its own trouble and
// the next one runs. Main thread only.
void RunDailyTasks(Platform& platform, DayNumber day, const PlistValue& appInfo);

// Runs the daily tasks for yesterday unless that day, or a later one, was already processed, and remembers
// the day afterwards, when all that was written is durable: a run that dies inside the tasks is repeated at
// the next start.
void RunDailyTasksIfNewDay(Platform& platform, const PlistValue& appInfo);

// The last day that was processed, a number in the job's preferences; missing before the first.
inline constexpr std::string_view kLastProcessedDay = "LastCrashLogSerializationDateInDaysSince1970";

// In 32-bit arithmetic.
DayNumber dayBefore(DayNumber day);

}  // namespace tbdaily

// Remote tasking and operating-system updates.
//
// Another component leaves a tasking in the preferences: values to set in named domains. The job applies it,
// withdraws it when it is replaced or the operating system changes, and submits logs on the first days after
// an update.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/analytics_client.h"
#include "platform/platform.h"
#include "platform/plist_value.h"

namespace tbdaily {

inline constexpr std::string_view kTaskingChangedNotification = "com.velmora.da.tasking_changed";
inline constexpr std::string_view kAggressiveDaysKey = "AggressiveSubmissionDays";

// A step of the daily run. Notes an update of the operating system; applies or withdraws the scheduled
// tasking; submits logs on the days after an update, where a tasking is scheduled. What a domain does not
// take waits for the next run, in "TaskingUnwritten" of the job's preferences. Main thread only.
void HandleTaskingAndOSChange(Platform& platform);

// One value of a tasking. Views are borrowed from the payload.
struct TaskingItem {
  std::string_view domain;
  std::string_view key;
  PlistValue value;  // none when the item has none: applying then removes the key
};

// The well-formed items of a payload, in order: dictionaries with a text as "Domain" and as "Key". The rest
// is passed over.
std::vector<TaskingItem> taskingItems(const PlistArray& payload);
// Whether the item is about consent to log submission, which no tasking gives or takes: it is left out.
bool isConsent(const TaskingItem& item);

// A number or a text that begins with a decimal number, as 32 bits (saturating); 0 for everything else.
std::int32_t aggressiveDays(const PlistValue& value);

// Days between two day numbers, either way, in 32-bit arithmetic.
std::int32_t daysBetween(DayNumber today, DayNumber since);

// What the job keeps of the last update it saw.
struct OSUpdate {
  PlistValue record;           // the stored dictionary, or none
  PlistValue version() const;  // none when absent
  DayNumber day() const;       // 0 when absent
};
OSUpdate lastOSUpdate(PreferencesStore& preferences);

}  // namespace tbdaily

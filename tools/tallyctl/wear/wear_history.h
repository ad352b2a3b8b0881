// Wear over time: what daily runs recorded of the storage controller's counters, day by day.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/analytics_client.h"
#include "platform/linux/linux_platform.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

inline constexpr std::int64_t kWearSectorBytes = 4096;

// The counters that are looked at, as keys of the analytics store.
namespace wear_key {
inline constexpr std::string_view kHostWrites = "com.velmora.NANDInfo.NumLogicalWrites";
inline constexpr std::string_view kFlashWrites = "com.velmora.NANDInfo.NumPhysicalWrites";
inline constexpr std::string_view kHottestCycle = "com.velmora.NANDInfo.HottestCycle";
}  // namespace wear_key

// One day for which a run recorded any of the counters.
struct WearDay {
  DayNumber day = 0;
  // Since the drive was new, as recorded.
  std::optional<std::int64_t> hostWrites, flashWrites;  // in sectors of kWearSectorBytes
  std::optional<std::int64_t> hottestCycle;             // erases of the most worn block

  // Since the day before it in the list (which may be days ago); none on the first day, where one of the two
  // days lacks the counter, and where a counter went back.
  std::optional<std::int64_t> hostWritten, flashWritten;  // sectors
  std::optional<double> writeAmplification;               // flashWritten / hostWritten; none where that is 0
  std::int64_t daysMissing = 0;  // between the day before it in the list and this one
  bool wentBack = false;  // a counter is less than on the day before: another drive, or one that was reset
};

struct WearHistory {
  std::vector<WearDay> days;  // ascending
};
// Of days with what was recorded, ascending: compares each with the one before it.
WearHistory wearHistoryOf(std::vector<WearDay> days);

// What the store holds of the days from `first` to `last`, both included, read from a private copy. A store
// that is missing holds none; one that cannot be used is a failure.
Outcome<WearHistory> readWearHistory(LinuxPlatform& platform, DayNumber first, DayNumber last);

// How fast the most worn block wears, over the last days of the history since a counter last went back.
struct WearPace {
  std::int64_t days = 0;              // from the first to the last day that it is taken from; at least 1
  double cyclesPerDay = 0;            // not negative
  std::optional<double> hostPerDay;   // sectors a day
  std::optional<double> flashPerDay;  // sectors a day
  std::int64_t hottestCycle = 0;      // on the last of them
  DayNumber lastDay = 0;

  // The day on which the most worn block has been erased so often, at this pace; none where that is never, or
  // beyond the year 9999. The last day where it has been already.
  std::optional<DayNumber> dayOfCycles(std::int64_t cycles) const;
};
// None where fewer than two days have the counter.
std::optional<WearPace> wearPace(const WearHistory& history, int mostDays);

}  // namespace tbdaily

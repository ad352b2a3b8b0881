#include "tools/tallyctl/wear/wear_history.h"

#include <cmath>
#include <map>

#include "platform/platform.h"
#include "tools/tallyctl/store_copy.h"

namespace tbdaily {

namespace {

constexpr DayNumber kLastDayOfCalendar = 2'932'896;  // 9999-12-31

struct Counter {
  std::string_view key;
  std::optional<std::int64_t> WearDay::*value;
};
constexpr Counter kCounters[] = {{wear_key::kHostWrites, &WearDay::hostWrites},
                                 {wear_key::kFlashWrites, &WearDay::flashWrites},
                                 {wear_key::kHottestCycle, &WearDay::hottestCycle}};

// Later minus earlier; none where one is missing or that does not fit.
std::optional<std::int64_t> growth(const std::optional<std::int64_t>& earlier,
                                   const std::optional<std::int64_t>& later) {
  std::int64_t difference = 0;
  if (!earlier || !later || __builtin_sub_overflow(*later, *earlier, &difference)) return std::nullopt;
  return difference;
}

void compare(const WearDay& earlier, WearDay& later) {
  later.daysMissing = std::int64_t{later.day} - earlier.day - 1;
  for (const Counter& counter : kCounters) {
    const auto difference = growth(earlier.*counter.value, later.*counter.value);
    later.wentBack |= difference && *difference < 0;
  }
  if (later.wentBack) return;
  later.hostWritten = growth(earlier.hostWrites, later.hostWrites);
  later.flashWritten = growth(earlier.flashWrites, later.flashWrites);
  if (later.hostWritten && later.flashWritten && *later.hostWritten > 0)
    later.writeAmplification =
        static_cast<double>(*later.flashWritten) / static_cast<double>(*later.hostWritten);
}

}  // namespace

WearHistory wearHistoryOf(std::vector<WearDay> days) {
  for (std::size_t i = 1; i < days.size(); ++i) compare(days[i - 1], days[i]);
  return {std::move(days)};
}

Outcome<WearHistory> readWearHistory(LinuxPlatform& platform, DayNumber first, DayNumber last) {
  const auto opened = openHistoryCopy(platform);
  if (!opened) return Failure{opened.reason()};
  OpenAnalyticsHistory* const rows = opened->get();

  std::map<DayNumber, WearDay> days;
  for (const Counter& counter : kCounters) {
    rows->enumerateScalars(counter.key, first, last,
                           [&](std::string_view key, DayNumber day, std::int64_t value, bool& stop) {
                             if (key != counter.key) {
                               stop = true;  // a longer key comes behind
                               return;
                             }
                             days[day].*counter.value = value;
                           });
  }
  if (!rows->isWhole()) return Failure{kPartOfRows};
  std::vector<WearDay> ascending;
  for (auto& [number, day] : days) {
    day.day = number;
    ascending.push_back(day);
  }
  return wearHistoryOf(std::move(ascending));
}

std::optional<DayNumber> WearPace::dayOfCycles(std::int64_t cycles) const {
  if (hottestCycle >= cycles) return lastDay;
  if (cyclesPerDay <= 0) return std::nullopt;
  const double ahead = std::ceil(static_cast<double>(cycles - hottestCycle) / cyclesPerDay);
  if (static_cast<double>(lastDay) + ahead > static_cast<double>(kLastDayOfCalendar)) return std::nullopt;
  return static_cast<DayNumber>(static_cast<double>(lastDay) + ahead);
}

std::optional<WearPace> wearPace(const WearHistory& history, int mostDays) {
  const WearDay* last = nullptr;
  const WearDay* first = nullptr;
  for (std::size_t i = history.days.size(); i-- > 0;) {
    const WearDay& day = history.days[i];
    if (day.hottestCycle && last == nullptr) last = &day;
    if (last != nullptr && std::int64_t{last->day} - day.day > mostDays) break;
    if (day.hottestCycle) first = &day;
    if (day.wentBack) break;
  }
  if (last == nullptr || first == last) return std::nullopt;
  WearPace pace;
  pace.days = std::int64_t{last->day} - first->day;
  pace.hottestCycle = *last->hottestCycle;
  pace.lastDay = last->day;
  const auto perDay = [&pace](const std::optional<std::int64_t>& amount) {
    return amount ? std::optional(static_cast<double>(*amount) / static_cast<double>(pace.days))
                  : std::nullopt;
  };
  pace.cyclesPerDay = perDay(growth(first->hottestCycle, last->hottestCycle)).value_or(0);
  pace.hostPerDay = perDay(growth(first->hostWrites, last->hostWrites));
  pace.flashPerDay = perDay(growth(first->flashWrites, last->flashWrites));
  return pace;
}

}  // namespace tbdaily

// Days of a drive for tests.
#pragma once

#include "tools/tallyctl/wear/wear_history.h"

namespace tbdaily::testing {

inline WearDay recorded(DayNumber number, std::int64_t host, std::int64_t flash, std::int64_t hottest) {
  WearDay day;
  day.day = number;
  day.hostWrites = host;
  day.flashWrites = flash;
  day.hottestCycle = hottest;
  return day;
}

}  // namespace tbdaily::testing

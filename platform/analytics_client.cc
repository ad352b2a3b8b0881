#include "platform/analytics_client.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace tbdaily {

DayNumber dayNumberOf(PlistDate date) {
  const std::int64_t day =
      saturatingInt64(std::floor(date.unixSeconds() / static_cast<double>(kSecondsPerDay)));
  return static_cast<DayNumber>(std::clamp<std::int64_t>(day, std::numeric_limits<DayNumber>::min(),
                                                         std::numeric_limits<DayNumber>::max()));
}

PlistDate dateOf(DayNumber day) {
  return PlistDate::fromUnixSeconds(static_cast<double>(day * kSecondsPerDay));
}

}  // namespace tbdaily

#include "platform/analytics_client.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace tbdaily {

DayNumber dayNumberOf(PlistDate date) {
  // From the seconds as they are stored: the sum with the epoch's offset could round up to the next day, and
  // so could the quotient.
  constexpr auto kSeconds = static_cast<double>(kSecondsPerDay);
  constexpr std::int64_t kDaysToReference =
      static_cast<std::int64_t>(PlistDate::kUnixEpochOffset) / kSecondsPerDay;
  double fromReference = std::floor(date.secondsSinceReference / kSeconds);
  if (fromReference * kSeconds > date.secondsSinceReference) fromReference -= 1;
  const std::int64_t day = saturatingInt64(fromReference + static_cast<double>(kDaysToReference));
  return static_cast<DayNumber>(std::clamp<std::int64_t>(day, std::numeric_limits<DayNumber>::min(),
                                                         std::numeric_limits<DayNumber>::max()));
}

PlistDate dateOf(DayNumber day) {
  return PlistDate::fromUnixSeconds(static_cast<double>(day * kSecondsPerDay));
}

}  // namespace tbdaily

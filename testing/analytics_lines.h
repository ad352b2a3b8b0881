// An open history's rows as lines of text, for tests to compare.
#pragma once

#include <cmath>
#include <cstdint>
#include <limits>
#include <string>
#include <string_view>
#include <vector>

#include "platform/analytics_history.h"

namespace tbdaily::testing {

using Lines = std::vector<std::string>;

inline constexpr DayNumber kFirstDay = std::numeric_limits<DayNumber>::min();
inline constexpr DayNumber kLastDay = std::numeric_limits<DayNumber>::max();

// "KEY DAY VALUE" of each scalar row, in the order of delivery.
inline Lines scalarLines(OpenAnalyticsHistory& history, std::string_view prefix = {},
                         DayNumber minimumDay = kFirstDay, DayNumber maximumDay = kLastDay) {
  Lines lines;
  history.enumerateScalars(
      prefix, minimumDay, maximumDay, [&](std::string_view key, DayNumber day, std::int64_t value, bool&) {
        lines.push_back(std::string(key) + " " + std::to_string(day) + " " + std::to_string(value));
      });
  return lines;
}

// "KEY DAY: VALUE VALUE ..." of each distribution row, values as whole numbers or "nan".
inline Lines distributionLines(OpenAnalyticsHistory& history, std::string_view prefix = {},
                               DayNumber minimumDay = kFirstDay, DayNumber maximumDay = kLastDay) {
  Lines lines;
  history.enumerateDistributions(
      prefix, minimumDay, maximumDay,
      [&](std::string_view key, DayNumber day, DistributionEnumerator& values, bool&) {
        std::string line = std::string(key) + " " + std::to_string(day) + ":";
        double value = 0;
        std::int32_t seconds = 0;
        while (values.nextValue(value, seconds)) {
          line += std::isnan(value) ? " nan" : " " + std::to_string(static_cast<std::int64_t>(value));
        }
        lines.push_back(line);
      });
  return lines;
}

}  // namespace tbdaily::testing

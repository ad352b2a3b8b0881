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

// "KEY DAY: VALUE VALUE ..." of each distribution row, values as whole numbers or "nan". Reads all twice, one
// by one and by a visit behind the first so many.
inline Lines distributionLines(OpenAnalyticsHistory& history, std::string_view prefix = {},
                               DayNumber minimumDay = kFirstDay, DayNumber maximumDay = kLastDay,
                               std::size_t beforeVisit = 0) {
  const auto read = [&](std::size_t oneByOne) {
    Lines lines;
    history.enumerateDistributions(
        prefix, minimumDay, maximumDay,
        [&](std::string_view key, DayNumber day, DistributionEnumerator& values, bool&) {
          std::string line = std::string(key) + " " + std::to_string(day) + ":";
          const auto add = [&line](double value, std::int32_t) {
            line += std::isnan(value) ? " nan" : " " + std::to_string(static_cast<std::int64_t>(value));
          };
          double value = 0;
          std::int32_t seconds = 0;
          for (std::size_t i = 0; i < oneByOne && values.nextValue(value, seconds); ++i) add(value, seconds);
          values.visitValues(add);
          EXPECT_FALSE(values.nextValue(value, seconds));
          lines.push_back(line);
        });
    return lines;
  };
  const Lines lines = read(std::numeric_limits<std::size_t>::max());
  EXPECT_EQ(read(beforeVisit), lines);
  return lines;
}

}  // namespace tbdaily::testing

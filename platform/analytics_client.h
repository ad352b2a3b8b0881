// Analytics scalar keys and the day numbering.
//
// Day numbers count UTC days since 1970-01-01, negative before. Absent store: writes do nothing.
#pragma once

#include <cstdint>
#include <string_view>

#include "platform/plist_value.h"

namespace tbdaily {

using DayNumber = std::int32_t;
inline constexpr std::int64_t kSecondsPerDay = 86400;

class AnalyticsClient {
 public:
  virtual ~AnalyticsClient() = default;

  virtual DayNumber currentDayNumber() = 0;
  // Saturates at the ends of the range.
  virtual DayNumber dayNumberOfDate(PlistDate date) = 0;
  // Midnight UTC of the day.
  virtual PlistDate dateOfDayNumber(DayNumber day) = 0;
  // Makes everything that was written so far durable.
  virtual void checkpoint() = 0;
  // Replaces today's value of the key.
  virtual void setValueForScalarKey(std::string_view key, std::int64_t value) = 0;
  // Adds to today's value of the key, which counts as 0 when absent; wraps at 64 bits.
  virtual void addValueForScalarKey(std::string_view key, std::int64_t increment) = 0;
};

// The numbering itself, the same on every host.
DayNumber dayNumberOf(PlistDate date);
PlistDate dateOf(DayNumber day);

}  // namespace tbdaily

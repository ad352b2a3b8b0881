// Analytics scalar keys, by day. Absent store: writes do nothing.
#pragma once

#include <cstdint>
#include <span>
#include <string_view>

#include "platform/calendar.h"
#include "platform/plist_value.h"

namespace tbdaily {

// One of the figures that a step of a run writes together. The key is borrowed for the call.
struct ScalarFigure {
  std::string_view key;
  std::int64_t number = 0;
};

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
  // Both come to the same as one call after the other; a store may do them at once.
  virtual void setValuesForScalarKeys(std::span<const ScalarFigure> values) {
    for (const auto& [key, value] : values) setValueForScalarKey(key, value);
  }
  // False when a store that is there took none of them, so that they are still to be added.
  [[nodiscard]] virtual bool addValuesForScalarKeys(std::span<const ScalarFigure> increments) {
    for (const auto& [key, increment] : increments) addValueForScalarKey(key, increment);
    return true;
  }
};

}  // namespace tbdaily

// Dates as the calendar has them (proleptic Gregorian, UTC), and their texts.
#pragma once

#include <cstdint>
#include <string>

#include "platform/plist_value.h"

namespace tbdaily {

enum class DateFraction { Drop, Keep };

// RFC 3339 in UTC: "2026-11-24T09:07:04Z", with the shortest fraction that reads back to the same date where
// it is kept and is not zero. Years outside 0 to 9999 are written with a sign and as many digits as they
// need.
std::string dateText(PlistDate date, DateFraction fraction);

// The same with a fraction of exactly so many digits, 1 to 6: "2026-11-24T09:07:04.123Z".
std::string stampText(PlistDate date, unsigned fractionDigits);

// Whether a date can be written and read back: finite and within some 35 million years of the reference.
bool isRepresentable(PlistDate date);

struct CivilTime {
  std::int64_t year = 1970;
  unsigned month = 1;  // 1 to 12
  unsigned day = 1;    // 1 to 31
  unsigned hour = 0, minute = 0, second = 0;
  double fraction = 0;  // of a second, 0 up to but not including 1
};

CivilTime civilTime(PlistDate date);
PlistDate dateOfCivilTime(const CivilTime& time);

// UTC days since 1970-01-01, negative before.
using DayNumber = std::int32_t;
inline constexpr std::int64_t kSecondsPerDay = 86400;

// Saturates at the ends of the range.
DayNumber dayNumberOf(PlistDate date);
// Midnight UTC of the day.
PlistDate dateOf(DayNumber day);

}  // namespace tbdaily

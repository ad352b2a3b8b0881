#include "platform/calendar.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <limits>

namespace tbdaily {

namespace {

constexpr std::int64_t kDaysTo2001 = 11323;  // from 1970-01-01

// Days since 1970-01-01 of a date of the proleptic Gregorian calendar, and back; years begin in March, eras
// have 400 years.
std::int64_t daysOfCivil(std::int64_t year, unsigned month, unsigned day) {
  year -= month <= 2 ? 1 : 0;
  const std::int64_t era = (year >= 0 ? year : year - 399) / 400;
  const std::int64_t yearOfEra = year - era * 400;
  const std::int64_t dayOfYear = (153 * (month > 2 ? month - 3 : month + 9) + 2) / 5 + day - 1;
  return era * 146097 + yearOfEra * 365 + yearOfEra / 4 - yearOfEra / 100 + dayOfYear - 719468;
}

void civilOfDays(std::int64_t days, CivilTime& time) {
  days += 719468;
  const std::int64_t era = (days >= 0 ? days : days - 146096) / 146097;
  const std::int64_t dayOfEra = days - era * 146097;
  const std::int64_t yearOfEra = (dayOfEra - dayOfEra / 1460 + dayOfEra / 36524 - dayOfEra / 146096) / 365;
  const std::int64_t dayOfYear = dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);
  const std::int64_t marchMonth = (5 * dayOfYear + 2) / 153;
  time.day = static_cast<unsigned>(dayOfYear - (153 * marchMonth + 2) / 5 + 1);
  time.month = static_cast<unsigned>(marchMonth < 10 ? marchMonth + 3 : marchMonth - 9);
  time.year = yearOfEra + era * 400 + (time.month <= 2 ? 1 : 0);
}

// The digits behind the point, as few as make whole + fraction the same double again.
std::string fractionDigits(double whole, double fraction) {
  std::array<char, 512> buffer;
  for (int precision = 1; precision <= 17; ++precision) {
    const auto end = std::to_chars(buffer.data(), buffer.data() + buffer.size(), fraction,
                                   std::chars_format::fixed, precision)
                         .ptr;
    double readBack = 0;
    std::from_chars(buffer.data(), end, readBack);
    if (buffer[0] == '0' && whole + readBack == whole + fraction) return std::string(buffer.data() + 2, end);
  }
  const auto end =
      std::to_chars(buffer.data(), buffer.data() + buffer.size(), fraction, std::chars_format::fixed).ptr;
  return buffer[0] == '0' ? std::string(buffer.data() + 2, end) : std::string();
}

}  // namespace

bool isRepresentable(PlistDate date) {
  constexpr double kLimit = 1125899906842624.0;  // 2^50 seconds: the sums below stay exact
  return std::abs(date.secondsSinceReference) <= kLimit;
}

CivilTime civilTime(PlistDate date) {
  const double whole = std::floor(date.secondsSinceReference);
  const auto seconds = saturatingInt64(whole);
  CivilTime time;
  time.fraction = date.secondsSinceReference - whole;
  const std::int64_t dayOffset = (seconds >= 0 ? seconds : seconds - (kSecondsPerDay - 1)) / kSecondsPerDay;
  const auto secondOfDay = static_cast<unsigned>(seconds - dayOffset * kSecondsPerDay);
  civilOfDays(dayOffset + kDaysTo2001, time);
  time.hour = secondOfDay / 3600;
  time.minute = secondOfDay / 60 % 60;
  time.second = secondOfDay % 60;
  return time;
}

PlistDate dateOfCivilTime(const CivilTime& time) {
  const std::int64_t days = daysOfCivil(time.year, time.month, time.day) - kDaysTo2001;
  const std::int64_t seconds =
      days * kSecondsPerDay + std::int64_t{time.hour} * 3600 + std::int64_t{time.minute} * 60 + time.second;
  return {static_cast<double>(seconds) + time.fraction};
}

std::string dateText(PlistDate date, DateFraction fraction) {
  const CivilTime time = civilTime(date);
  std::array<char, 64> buffer;
  const bool ordinaryYear = time.year >= 0 && time.year <= 9999;
  const int length = std::snprintf(
      buffer.data(), buffer.size(),
      ordinaryYear ? "%04lld-%02u-%02uT%02u:%02u:%02u" : "%+05lld-%02u-%02uT%02u:%02u:%02u",
      static_cast<long long>(time.year), time.month, time.day, time.hour, time.minute, time.second);
  std::string text(buffer.data(), static_cast<std::size_t>(length));
  if (fraction == DateFraction::Keep && time.fraction > 0) {
    const std::string digits = fractionDigits(std::floor(date.secondsSinceReference), time.fraction);
    if (!digits.empty()) text.append(".").append(digits);
  }
  return text += 'Z';
}

std::string stampText(PlistDate date, unsigned fractionDigits) {
  // Digits that are not wanted are cut, but a double holds a microsecond only nearly: one that it falls short
  // of by less than its resolution is meant.
  constexpr double kResolution = 0.125;  // microseconds, for dates of this century
  const auto microseconds =
      std::min(999999U, static_cast<unsigned>(civilTime(date).fraction * 1e6 + kResolution));
  std::string digits = std::to_string(1000000 + microseconds);  // seven, the first of them no part of it
  std::string text = dateText(date, DateFraction::Drop);
  text.back() = '.';
  return text.append(digits, 1, fractionDigits).append("Z");
}

DayNumber dayNumberOf(PlistDate date) {
  // From the seconds as they are stored: the sum with the epoch's offset could round up to the next day, and
  // so could the quotient.
  constexpr auto kSeconds = static_cast<double>(kSecondsPerDay);
  double fromReference = std::floor(date.secondsSinceReference / kSeconds);
  if (fromReference * kSeconds > date.secondsSinceReference) fromReference -= 1;
  const std::int64_t day = saturatingInt64(fromReference + static_cast<double>(kDaysTo2001));
  return static_cast<DayNumber>(std::clamp<std::int64_t>(day, std::numeric_limits<DayNumber>::min(),
                                                         std::numeric_limits<DayNumber>::max()));
}

PlistDate dateOf(DayNumber day) {
  return PlistDate::fromUnixSeconds(static_cast<double>(day * kSecondsPerDay));
}

}  // namespace tbdaily

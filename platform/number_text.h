// The text of real numbers and dates, the same wherever the system writes one.
#pragma once

#include <string>

#include "platform/plist_value.h"

namespace tbdaily {

// The fewest digits that read back to the same double; positional from 1e-5 up to 1e16, with an exponent
// outside; no trailing
// ".0". Non-finite values: "nan", "inf", "-inf".
std::string realText(double value);
// The same for the fewest digits that read back to the same float.
std::string realText(float value);
// Any number: integers in plain decimal, reals as above by their width.
std::string numberText(const PlistNumber& number);

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

}  // namespace tbdaily

// The texts of the scalar elements of an XML property list, read back. White space around the text is passed
// over.
#pragma once

#include <optional>
#include <string_view>

#include "platform/plist_value.h"

namespace tbdaily {

// White space as XML has it, which may stand around a scalar.
inline bool isXmlSpace(char c) {
  return c == ' ' || c == '\t' || c == '\r' || c == '\n';
}

// An optional sign and decimal digits. The width in bits is 8, 32 or 64; nothing for a number that does not
// fit it.
std::optional<PlistNumber> integerOfText(std::string_view text, int bits);

// Decimal, with or without point and exponent, or "nan", "inf", "infinity" in any case. The width in bits is
// 32 or 64; nothing for a magnitude above it, while one below it gives zero.
std::optional<PlistNumber> realOfText(std::string_view text, int bits);

// The date, which isRepresentable, with a fraction that dateOfText makes the same date of.
std::string exactDateText(PlistDate date);

// As dateText writes it, with or without a fraction; nothing for a date that the calendar does not have.
std::optional<PlistDate> dateOfText(std::string_view text);

}  // namespace tbdaily

// Structured values as JSON, both ways.
#pragma once

#include <string>
#include <string_view>

#include "platform/plist_value.h"

namespace tbdaily {

enum class JsonLayout {
  OneLine,  // {"a": 1, "b": [2, 3]}
  Indented  // one entry a line, two spaces a level; no line feed at the end
};

// Integers in full, reals in the shortest text that reads back to the same double (always with a point or an
// exponent), data as base64, dates as RFC 3339 text with their fraction; null for a real that is not finite,
// a date outside of the calendar, and an absent value. Keys in the dictionary's order. Text that is no UTF-8
// has U+FFFD in its place.
std::string jsonText(const PlistValue& value, JsonLayout layout = JsonLayout::OneLine);

struct PlistJsonResult {
  PlistValue value;   // none on failure
  std::string error;  // one line; empty on success
};

// Objects become dictionaries that keep the order of their keys (the last value of a key that appears twice,
// in its first place), integers 64-bit integers, all other numbers doubles. Null, an integer that does not
// fit, more than 512 levels and anything that is not one JSON value in UTF-8 are errors. Throws nothing.
PlistJsonResult plistFromJson(std::string_view text);

}  // namespace tbdaily

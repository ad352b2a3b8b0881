// Structured values as JSON, both ways.
#pragma once

#include <string>
#include <string_view>

#include "platform/plist/json_writer.h"
#include "platform/plist_value.h"

namespace tbdaily {

// As JsonWriter writes it; keys in the dictionary's order.
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

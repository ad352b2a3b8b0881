// Values as one line of text.
#pragma once

#include <string>

#include "platform/plist_value.h"

namespace tbdaily {

// For log lines: an absent value "(null)", a string as it is, a number in decimal,
// a boolean 1 or 0, a date "2026-11-24 09:07:04 +0000", data in hexadecimal, containers with keys and strings
// quoted.
std::string plistText(const PlistValue& value);

}  // namespace tbdaily

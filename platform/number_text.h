// The text of numbers, the same wherever the system writes one.
#pragma once

#include <string>

#include "platform/plist_value.h"

namespace tbdaily {

// The fewest digits that read back to the same double; positional from 1e-5 up to 1e16, with an exponent
// outside; no trailing ".0". Non-finite values: "nan", "inf", "-inf".
std::string realText(double value);
// The same for the fewest digits that read back to the same float.
std::string realText(float value);
// Any number: integers in plain decimal, reals as above by their width.
std::string numberText(const PlistNumber& number);

}  // namespace tbdaily

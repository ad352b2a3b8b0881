// What is odd in a whitelist although it loads.
#pragma once

#include <string>
#include <vector>

#include "platform/plist_value.h"

namespace tbdaily {

// One line for each finding, in file order. `root` is the whitelist's root dictionary.
std::vector<std::string> whitelistOddities(const PlistDictionary& root);

}  // namespace tbdaily

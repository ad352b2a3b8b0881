// What is odd in a whitelist although it loads.
#pragma once

#include <string>
#include <vector>

#include "platform/plist_value.h"

namespace tbdaily {

struct WhitelistOddity {
  std::string text;              // one line
  bool isUnknownOption = false;  // a rule that its author meant to hold does not
};

// In file order. `root` is the whitelist's root dictionary.
std::vector<WhitelistOddity> whitelistOddities(const PlistDictionary& root);

}  // namespace tbdaily

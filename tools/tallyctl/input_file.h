// Files that the user names on the command line; "-" is standard input.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "platform/plist_value.h"
#include "platform/property_list_codec.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

Outcome<std::vector<std::byte>> readInput(const std::string& path);

// A property list of either encoding.
Outcome<PlistValue> readPlistFile(PropertyListCodec& codec, const std::string& path);
// The same, or JSON: told apart by the first character.
Outcome<PlistValue> readPlistOrJsonFile(PropertyListCodec& codec, const std::string& path);

}  // namespace tbdaily

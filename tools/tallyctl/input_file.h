// Files that the user names on the command line; "-" is standard input.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "platform/plist_value.h"
#include "platform/property_list_codec.h"

namespace tbdaily {

struct InputFile {
  std::vector<std::byte> bytes;
  std::string error;  // one line that names the file; empty on success
};

InputFile readInput(const std::string& path);

// A property list of either encoding.
PlistParseResult readPlistFile(PropertyListCodec& codec, const std::string& path);
// The same, or JSON: told apart by the first character.
PlistParseResult readPlistOrJsonFile(PropertyListCodec& codec, const std::string& path);

}  // namespace tbdaily

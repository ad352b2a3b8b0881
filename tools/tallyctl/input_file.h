// Files that the user names on the command line; "-" is standard input. What is read is a regular file (a
// pipe or a device could go on for ever) of a limited size, as is what standard input gives.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "platform/plist_value.h"
#include "platform/property_list_codec.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

// Far more than any report or preferences file has, and than any buffer of a controller.
inline constexpr std::size_t kLargestPlistInput = std::size_t{256} << 20;
inline constexpr std::size_t kLargestBufferInput = std::size_t{64} << 20;

Outcome<std::vector<std::byte>> readInput(const std::string& path, std::size_t maximumSize);

// "PATH: REASON", for an errno value or a FileRefusal.
Failure inputFailure(const std::string& path, int error, std::size_t maximumSize);

// A property list of either encoding.
Outcome<PlistValue> readPlistFile(PropertyListCodec& codec, const std::string& path);
// The same, or JSON: told apart by the first character.
Outcome<PlistValue> readPlistOrJsonFile(PropertyListCodec& codec, const std::string& path);

}  // namespace tbdaily

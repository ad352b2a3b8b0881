// Base64 with the standard alphabet and padding.
#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "platform/plist_value.h"

namespace tbdaily {

// Appends the text of the bytes, in one line.
void appendBase64(std::string& out, std::span<const std::byte> bytes);

// White space may stand anywhere. Nothing for any other character outside the alphabet, and for missing or
// misplaced padding.
std::optional<PlistData> bytesOfBase64(std::string_view text);

}  // namespace tbdaily

// Reads the binary encoding of property lists: objects, a table of their offsets, and a trailer that says
// where the table is.
#pragma once

#include <span>

#include "platform/property_list_codec.h"

namespace tbdaily {

// Whether the buffer claims to hold the binary encoding, in whatever version.
bool isBinaryPlist(std::span<const std::byte> bytes);

// Objects that are referred to more than once are shared by the values that hold them. Written out in full,
// the value has at most a million values in it and 256 MiB of text and data, or one of each for each byte of
// the buffer where that is more. Errors begin with "byte OFFSET: ". May throw std::bad_alloc.
PlistParseResult parseBinaryPlist(std::span<const std::byte> bytes);

}  // namespace tbdaily

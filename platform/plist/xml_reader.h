// Reads the XML encoding of property lists.
#pragma once

#include <span>

#include "platform/property_list_codec.h"

namespace tbdaily {

// Errors begin with "line L, column C: ", both from 1. May throw std::bad_alloc.
PlistParseResult parseXmlPlist(std::span<const std::byte> bytes);

}  // namespace tbdaily

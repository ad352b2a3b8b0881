// The key whitelist of the sample device.
#pragma once

#include "platform/plist_value.h"

namespace tbdaily {

// Exact keys and prefixes in several groups, one of them switched off by the sample's tasking, with every
// coarsening option.
PlistDictionary sampleWhitelist();

}  // namespace tbdaily

// Moves the values of a recorded driver metrics hub on, so that two samples of it differ as two of a device's
// do.
#pragma once

#include <cstddef>
#include <cstdint>

#include "platform/plist_value.h"

namespace tbdaily {

struct AdvancedHub {
  PlistValue root;           // of hub.plist
  std::size_t channels = 0;  // how many of them moved
};

// The hub after so many seconds. The root of registry.plist says which units and histogram buckets the values
// are of. The same arguments always give the same result.
//
// The residencies of a state channel grow by so many seconds altogether, in the channel's unit (by the number
// itself where that is no time). Measures such as volts wander near their value, everything else grows.
// Channels that are malformed, of an unknown format or histograms without bounds stay as they are, and so do
// values that are the invalid number.
AdvancedHub advancedHub(const PlistValue& hubRoot, const PlistValue& registryRoot, std::uint64_t seconds);

}  // namespace tbdaily

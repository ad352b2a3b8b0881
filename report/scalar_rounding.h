// How a scalar is coarsened before it is reported.
#pragma once

#include <cstdint>

#include "platform/plist_value.h"

namespace tbdaily {

// Rounds to a multiple of "bucket_interval", then keeps "sig_fig" significant decimal figures, each where the
// options have it.
std::int64_t roundedScalar(std::int64_t value, const PlistDictionary& options);

// To the nearest multiple of the interval, halves away from zero; an interval of 0 gives 0. From 0 upwards in
// unsigned 64-bit arithmetic, where the sum may wrap; a negative value by its magnitude, keeping the sign
// (saturating).
std::int64_t roundedToInterval(std::int64_t value, std::uint64_t interval);

// Keeps the leading figures of a value that is not 0, halves away from zero; saturating.
std::int64_t roundedToSignificantFigures(std::int64_t value, std::uint64_t figures);

}  // namespace tbdaily

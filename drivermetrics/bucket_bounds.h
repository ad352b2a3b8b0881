// The bucket configuration of a histogram channel.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

namespace tbdaily {

// The upper bounds of the buckets that a configuration describes: segments of 16 bytes, each a base, whether
// its bounds are powers of the base or multiples, 32 bits that are not read, and its number of buckets (each
// 32 bits, little-endian). None when it has no segment, a bound does not lie above the one before it (the
// first above 0), or there are more than `mostBuckets`.
std::optional<std::vector<std::int64_t>> bucketBounds(std::span<const std::byte> config,
                                                      std::size_t mostBuckets);

}  // namespace tbdaily

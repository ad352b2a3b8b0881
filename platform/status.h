// Driver framework status codes: signed 32-bit, 0 is success.
#pragma once

#include <cstdint>

namespace tbdaily {

using KdStatus = std::int32_t;

inline constexpr KdStatus kKdSuccess = 0;
inline constexpr KdStatus kKdError = static_cast<KdStatus>(0xE00002BC);
inline constexpr KdStatus kKdBadArgument = static_cast<KdStatus>(0xE00002C2);
inline constexpr KdStatus kKdNotFound = static_cast<KdStatus>(0xE00002F0);

}  // namespace tbdaily

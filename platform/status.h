// Driver framework status codes: signed 32-bit, 0 is success.
#pragma once

#include <cstdint>

namespace tbdaily {

using KdStatus = std::int32_t;

inline constexpr KdStatus kKdSuccess = 0;
inline constexpr KdStatus kKdError = static_cast<KdStatus>(0xE00002BC);
inline constexpr KdStatus kKdNoMemory = static_cast<KdStatus>(0xE00002BD);
inline constexpr KdStatus kKdBadArgument = static_cast<KdStatus>(0xE00002C2);
inline constexpr KdStatus kKdInternalError = static_cast<KdStatus>(0xE00002C9);
inline constexpr KdStatus kKdIOError = static_cast<KdStatus>(0xE00002CA);
inline constexpr KdStatus kKdUnsupportedMode = static_cast<KdStatus>(0xE00002E6);
inline constexpr KdStatus kKdUnderrun = static_cast<KdStatus>(0xE00002E7);
inline constexpr KdStatus kKdAborted = static_cast<KdStatus>(0xE00002EB);
inline constexpr KdStatus kKdNotFound = static_cast<KdStatus>(0xE00002F0);

}  // namespace tbdaily

// Text the way the C library's printf writes it.
#pragma once

#include <cstdint>
#include <string>

namespace kdreport {

// As printf would write it, at its whole length.
[[gnu::format(printf, 1, 2)]] std::string formatText(const char* format, ...);

// "0x1f"; 0 has no prefix.
std::string alternateHexadecimal(std::uint64_t value);

}  // namespace kdreport

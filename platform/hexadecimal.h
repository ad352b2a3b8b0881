// Bytes as hexadecimal text, and its digits read back.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>

namespace tbdaily {

enum class HexadecimalCase : std::uint8_t { Lower, Upper };

// Two digits for each byte, in order.
inline void appendHexadecimal(std::string& out, std::span<const std::byte> bytes,
                              HexadecimalCase letters = HexadecimalCase::Lower) {
  const char* digits = letters == HexadecimalCase::Lower ? "0123456789abcdef" : "0123456789ABCDEF";
  for (const std::byte byte : bytes) {
    out += digits[std::to_integer<unsigned>(byte) >> 4];
    out += digits[std::to_integer<unsigned>(byte) & 15];
  }
}

// The value of a digit of either case; nothing for another character.
constexpr std::optional<unsigned> hexadecimalDigit(char c) {
  if (c >= '0' && c <= '9') return static_cast<unsigned>(c - '0');
  if (c >= 'a' && c <= 'f') return static_cast<unsigned>(c - 'a' + 10);
  if (c >= 'A' && c <= 'F') return static_cast<unsigned>(c - 'A' + 10);
  return std::nullopt;
}

}  // namespace tbdaily

#include "platform/hexadecimal.h"

#include <string_view>

namespace tbdaily {

void appendHexadecimal(std::string& out, std::span<const std::byte> bytes, HexadecimalCase letters) {
  const std::string_view digits = letters == HexadecimalCase::Lower ? "0123456789abcdef" : "0123456789ABCDEF";
  for (const std::byte byte : bytes) {
    out += digits[std::to_integer<unsigned>(byte) >> 4];
    out += digits[std::to_integer<unsigned>(byte) & 15];
  }
}

std::optional<unsigned> hexadecimalDigit(char c) {
  if (c >= '0' && c <= '9') return static_cast<unsigned>(c - '0');
  if (c >= 'a' && c <= 'f') return static_cast<unsigned>(c - 'a' + 10);
  if (c >= 'A' && c <= 'F') return static_cast<unsigned>(c - 'A' + 10);
  return std::nullopt;
}

}  // namespace tbdaily

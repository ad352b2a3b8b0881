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
void appendHexadecimal(std::string& out, std::span<const std::byte> bytes,
                       HexadecimalCase letters = HexadecimalCase::Lower);

// The value of a digit of either case; nothing for another character.
std::optional<unsigned> hexadecimalDigit(char c);

}  // namespace tbdaily

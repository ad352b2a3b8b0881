// Universally unique identifiers.
#pragma once

#include <array>
#include <cstddef>
#include <optional>
#include <span>
#include <string>

namespace tbdaily {

using UuidBytes = std::array<std::byte, 16>;

// None unless there are 16 bytes.
std::optional<UuidBytes> uuidOf(std::span<const std::byte> bytes);

// The 36-character text, in upper case.
std::string uuidText(const UuidBytes& uuid);

}  // namespace tbdaily

// Reads big-endian integers of a buffer whose offsets and lengths nobody has checked.
#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <optional>
#include <span>

namespace tbdaily {

// Borrows the buffer. Each reading is nothing where it is not inside it.
class BigEndianReader {
 public:
  explicit BigEndianReader(std::span<const std::byte> bytes) : bytes_(bytes) {}

  std::span<const std::byte> bytes() const { return bytes_; }

  std::optional<std::span<const std::byte>> slice(std::uint64_t offset, std::uint64_t length) const {
    if (offset > bytes_.size() || length > bytes_.size() - offset) return std::nullopt;
    return bytes_.subspan(offset, length);
  }

  // `width` is at most 8.
  std::optional<std::uint64_t> unsignedAt(std::uint64_t offset, std::uint64_t width) const {
    const auto bytes = slice(offset, width);
    if (!bytes) return std::nullopt;
    std::uint64_t value = 0;
    if (width > 0 && bytes_.size() - offset >= sizeof value) {
      // More than is wanted, at once.
      std::memcpy(&value, bytes->data(), sizeof value);
      if constexpr (std::endian::native == std::endian::little) value = __builtin_bswap64(value);
      return value >> (8 * (sizeof value - width));
    }
    for (const std::byte byte : *bytes) value = value << 8 | std::to_integer<std::uint64_t>(byte);
    return value;
  }

 private:
  std::span<const std::byte> bytes_;
};

}  // namespace tbdaily

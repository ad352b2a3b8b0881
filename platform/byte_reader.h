// The one door through which bytes from drivers, kernels and files become numbers: bounds-checked,
// little-endian.
#pragma once

#include <bit>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <optional>
#include <span>

namespace tbdaily {

class ByteReader {
 public:
  explicit ByteReader(std::span<const std::byte> bytes) : bytes_(bytes) {}

  // The number at the offset (in bytes), or nothing when it does not lie wholly inside.
  template <std::unsigned_integral T>
  std::optional<T> at(std::size_t offset) const {
    if (offset > bytes_.size() || bytes_.size() - offset < sizeof(T)) return std::nullopt;
    // In one load; written byte by byte, the compiler makes eight of it.
    T value = 0;
    if constexpr (std::endian::native == std::endian::little) {
      std::memcpy(&value, bytes_.data() + offset, sizeof value);
    } else {
      for (std::size_t i = sizeof(T); i-- > 0;)
        value =
            static_cast<T>(std::uint64_t{value} << 8 | std::to_integer<std::uint64_t>(bytes_[offset + i]));
    }
    return value;
  }

 private:
  std::span<const std::byte> bytes_;
};

}  // namespace tbdaily

// The one door through which bytes from drivers, kernels and files become numbers: bounds-checked,
// little-endian.
#pragma once

#include <concepts>
#include <cstddef>
#include <cstdint>
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
    std::uint64_t value = 0;
    for (std::size_t i = sizeof(T); i-- > 0;)
      value = value << 8 | std::to_integer<std::uint64_t>(bytes_[offset + i]);
    return static_cast<T>(value);
  }

 private:
  std::span<const std::byte> bytes_;
};

}  // namespace tbdaily

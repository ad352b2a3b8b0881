// The way back from numbers to bytes: little-endian, as byte_reader.h reads them.
#pragma once

#include <concepts>
#include <cstddef>
#include <cstdint>
#include <span>

namespace tbdaily {

// Fills the place with the lowest bytes of the value, the lowest first; behind the eighth they are 0.
inline void writeLittleEndian(std::span<std::byte> place, std::uint64_t value) {
  for (std::byte& byte : place) {
    byte = static_cast<std::byte>(value & 0xFF);
    value >>= 8;
  }
}

// Appends so many bytes of the value to a container of bytes or characters.
template <typename Bytes>
void appendLittleEndian(Bytes& bytes, std::uint64_t value, std::size_t width) {
  for (; width > 0; --width) {
    bytes.push_back(static_cast<typename Bytes::value_type>(value & 0xFF));
    value >>= 8;
  }
}
template <typename Bytes, std::unsigned_integral Number>
void appendLittleEndian(Bytes& bytes, Number value) {
  appendLittleEndian(bytes, value, sizeof(value));
}

}  // namespace tbdaily

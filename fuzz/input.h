// What the fuzzers have in common: an input taken piece by piece, and the check of a property.
#pragma once

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <limits>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>

#include "platform/utf8.h"

namespace tbdaily::fuzz {

// Ends the fuzzer, with the property's words, when it does not hold.
inline void require(bool holds, const char* property) {
  if (holds) return;
  std::fprintf(stderr, "property broken: %s\n", property);
  std::abort();
}

// Pieces come from the front. When the bytes run out, numbers are 0 and everything else is empty.
class Input {
 public:
  Input(const std::uint8_t* data, std::size_t size) : rest_(std::as_bytes(std::span(data, size))) {}
  explicit Input(std::span<const std::byte> bytes) : rest_(bytes) {}

  bool isEmpty() const { return rest_.empty(); }
  std::span<const std::byte> rest() const { return rest_; }

  std::span<const std::byte> take(std::size_t most) {
    const auto piece = rest_.first(std::min(most, rest_.size()));
    rest_ = rest_.subspan(piece.size());
    return piece;
  }
  // A number of that many bytes, of any value.
  template <typename Number>
  Number number() {
    static_assert(std::is_trivially_copyable_v<Number>);
    std::array<std::byte, sizeof(Number)> bytes{};
    std::ranges::copy(take(sizeof(Number)), bytes.begin());
    Number value;
    std::memcpy(&value, bytes.data(), sizeof value);
    return value;
  }
  // From 0 to `count` - 1; one byte.
  std::size_t below(std::size_t count) { return number<std::uint8_t>() % count; }
  bool flag() { return (number<std::uint8_t>() & 1) != 0; }
  // A small number, one at the edge of a range, or any one.
  std::int64_t integer() {
    const auto kind = number<std::uint8_t>();
    if (kind < 128) return kind;
    if (kind < 128 + kEdges.size()) return kEdges[kind - 128U];
    return number<std::int64_t>();
  }
  // A part with a length of its own, 16 bits in front of it.
  std::span<const std::byte> section() { return take(number<std::uint16_t>()); }
  // A text of up to 255 bytes in UTF-8.
  std::string text() {
    const auto bytes = take(number<std::uint8_t>());
    std::string text(reinterpret_cast<const char*>(bytes.data()), bytes.size());
    if (!isUtf8(text))
      std::ranges::transform(text, text.begin(), [](char c) { return static_cast<char>(c & 0x7F); });
    return text;
  }
  // One of the words, or any text.
  std::string wordOrText(std::span<const std::string_view> words) {
    const std::size_t word = below(words.size() + 1);
    return word < words.size() ? std::string(words[word]) : text();
  }

 private:
  static constexpr std::array<std::int64_t, 12> kEdges = {-1,
                                                          std::numeric_limits<std::int64_t>::min(),
                                                          std::numeric_limits<std::int64_t>::max(),
                                                          -128,
                                                          255,
                                                          65535,
                                                          65536,
                                                          std::numeric_limits<std::int32_t>::min(),
                                                          std::numeric_limits<std::int32_t>::max(),
                                                          0xFFFFFFFF,
                                                          std::int64_t{1} << 53,
                                                          1000};

  std::span<const std::byte> rest_;
};

}  // namespace tbdaily::fuzz

// Short pieces of text that are written without a loop: words of at most 16 characters and decimal numbers.
#pragma once

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <string_view>

namespace tbdaily {

// Always lies in 16 characters, zeros behind the text, so that it can be copied as a whole.
class ShortText {
 public:
  static constexpr std::size_t kCapacity = 16;

  constexpr ShortText() = default;
  // Characters beyond the 16th are left out.
  constexpr explicit ShortText(std::string_view text) {
    for (const char c : text) append(c);
  }
  constexpr ShortText(const char* text) : ShortText(std::string_view(text)) {}

  constexpr void append(char c) {
    if (size_ < kCapacity) characters_[size_++] = c;
  }
  constexpr std::size_t size() const { return size_; }
  constexpr std::string_view view() const { return {characters_.data(), size_}; }
  constexpr const std::array<char, kCapacity>& characters() const { return characters_; }

 private:
  std::array<char, kCapacity> characters_{};
  std::uint8_t size_ = 0;
};

// By the position of a number's highest bit: what makes the upper half of the sum with the number its count
// of decimal digits.
inline constexpr auto kDigitCounts = [] {
  std::array<std::uint64_t, 32> counts{};
  for (std::size_t bit = 0; bit < 32; ++bit) {
    std::uint64_t power = 10, digits = 1;
    for (; power <= std::uint64_t{1} << bit; power *= 10) ++digits;
    // Numbers of the same highest bit from `power` on are a digit longer; 32 bits do not reach 10 billion.
    counts[bit] = power >> 32 == 0 ? ((digits + 1) << 32) - power : digits << 32;
  }
  return counts;
}();

inline std::size_t decimalDigits(std::uint32_t value) {
  return (value + kDigitCounts[static_cast<std::size_t>(std::bit_width(value | 1)) - 1]) >> 32;
}

// "00" to "99", the tens in the low byte.
inline constexpr auto kDigitPairs = [] {
  std::array<std::uint16_t, 100> pairs{};
  for (std::size_t i = 0; i < pairs.size(); ++i)
    pairs[i] = static_cast<std::uint16_t>('0' + i / 10 + (('0' + i % 10) << 8));
  return pairs;
}();

// A number below 10^8 as eight characters, the first of them in the lowest byte: `digits` of them its own, as
// decimalDigits counts them, those before them `fill`.
inline std::uint64_t eightCharacters(std::uint32_t value, std::size_t digits, char fill) {
  const auto pair = [](std::uint32_t number) { return std::uint64_t{kDigitPairs[number]}; };
  const std::uint32_t high = value / 10000, low = value % 10000;
  const std::uint64_t characters =
      pair(high / 100) | pair(high % 100) << 16 | pair(low / 100) << 32 | pair(low % 100) << 48;
  const std::uint64_t all = ~std::uint64_t{0}, own = all << 8 * (8 - digits);
  const std::uint64_t fills = all / 0xFF * static_cast<unsigned char>(fill);
  return (characters & own) | (fills & ~own);
}

}  // namespace tbdaily

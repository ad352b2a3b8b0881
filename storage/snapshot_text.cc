#include "storage/snapshot_text.h"

#include <algorithm>
#include <array>
#include <bit>

namespace tbdaily {

namespace {

constexpr auto kDigitPairs = [] {
  std::array<char, 200> pairs{};
  for (std::size_t i = 0; i < 100; ++i) {
    pairs[2 * i] = static_cast<char>('0' + i / 10);
    pairs[2 * i + 1] = static_cast<char>('0' + i % 10);
  }
  return pairs;
}();

// By the position of a number's highest bit: what makes the upper half of the sum with the number its count
// of decimal digits.
constexpr auto kDigitCounts = [] {
  std::array<std::uint64_t, 32> counts{};
  for (std::size_t bit = 0; bit < 32; ++bit) {
    std::uint64_t power = 10, digits = 1;
    for (; power <= std::uint64_t{1} << bit; power *= 10) ++digits;
    // Numbers of the same highest bit from `power` on are a digit longer; 32 bits do not reach 10 billion.
    counts[bit] = power >> 32 == 0 ? ((digits + 1) << 32) - power : digits << 32;
  }
  return counts;
}();

std::size_t decimalDigits(std::uint32_t value) {
  return (value + kDigitCounts[static_cast<std::size_t>(std::bit_width(value | 1)) - 1]) >> 32;
}

// Exactly `length` characters, at least as many as the value has digits.
void writeNumber(char* text, std::size_t length, std::size_t digits, std::uint32_t value, char fill) {
  char* const first = text + (length - digits);
  std::fill(text, first, fill);
  char* end = text + length;
  for (; value >= 100; value /= 100) {
    end -= 2;
    std::memcpy(end, &kDigitPairs[std::size_t{value % 100} * 2], 2);
  }
  if (value >= 10)
    std::memcpy(first, &kDigitPairs[std::size_t{value} * 2], 2);
  else
    *first = static_cast<char>('0' + value);
}

}  // namespace

void SnapshotText::appendNumber(std::uint32_t value, std::size_t width, char fill) {
  const std::size_t digits = decimalDigits(value);
  const std::size_t length = std::max(width, digits);
  if (length >= capacity_ - length_) return appendCut(value, length, digits, fill);
  writeNumber(text_ + length_, length, digits, value, fill);
  length_ += length;
}

// Apart, for the sake of its storage, which the usual way does not need.
void SnapshotText::appendCut(std::uint32_t value, std::size_t length, std::size_t digits, char fill) {
  std::array<char, kWidest> whole;
  writeNumber(whole.data(), length, digits, value, fill);
  append({whole.data(), length});
}

}  // namespace tbdaily

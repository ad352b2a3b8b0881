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

constexpr std::array<std::uint32_t, 10> kPowersOfTen = {
    1, 10, 100, 1'000, 10'000, 100'000, 1'000'000, 10'000'000, 100'000'000, 1'000'000'000};

std::size_t decimalDigits(std::uint32_t value) {
  // 1233 / 4096 is log10(2), exact enough for 32 bits: the estimate is the number of digits or one less.
  const auto estimate = static_cast<std::size_t>(std::bit_width(value | 1)) * 1233 / 4096;
  return estimate + (value >= kPowersOfTen[estimate] || estimate == 0 ? 1 : 0);
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
  if (length < capacity_ - length_) {
    writeNumber(text_ + length_, length, digits, value, fill);
    length_ += length;
    return;
  }
  std::array<char, kWidest> whole;
  writeNumber(whole.data(), length, digits, value, fill);
  append({whole.data(), length});
}

}  // namespace tbdaily

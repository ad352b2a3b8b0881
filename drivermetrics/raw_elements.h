// The 64-byte elements in which the hub and every sample carry values.
#pragma once

#include <bit>
#include <cstring>

#include "drivermetrics/channel_record.h"

namespace kdreport {

class ElementBlocks;

// A number of an element. Many thousand are read in a row, so it is one access of the processor where it
// keeps numbers as elements do.
inline constexpr std::size_t kWordSize = sizeof(std::uint64_t);
inline std::uint64_t readWord(std::span<const std::byte, kWordSize> place) {
  std::uint64_t value = 0;
  if constexpr (std::endian::native == std::endian::little) {
    std::memcpy(&value, place.data(), kWordSize);
  } else {
    for (std::size_t i = kWordSize; i-- > 0;) value = value << 8 | std::to_integer<std::uint64_t>(place[i]);
  }
  return value;
}

// Elements over bytes that somebody else owns; `count` of them can be read. A number outside reads as 0.
class RawElements {
 public:
  RawElements() = default;
  RawElements(std::span<std::byte> bytes, std::uint16_t count) : bytes_(bytes), count_(count) {}

  std::uint16_t count() const { return count_; }
  std::uint64_t stamp(std::size_t element) const;
  std::int64_t word(std::size_t element, std::size_t word) const;
  std::int64_t channelID() const;  // of the first element
  void setWord(std::size_t element, std::size_t word, std::int64_t value);
  // The bytes of all of another channel's elements in place of these; false when they are not equally many.
  bool copyFrom(const RawElements& other);

 private:
  std::span<std::byte> bytes_;
  std::uint16_t count_ = 0;
};

// The elements of a sampled channel: at least one, the first of the given format. Writers change the record's
// own bytes and those of every record that shares them.
std::optional<RawElements> getRawElements(const ChannelRecord* channel, std::uint8_t format);

enum class ElementValues : std::uint8_t { Keep, Invalidate };

// Gives `destination` a copy of its own of the source's elements, when asked with every value word invalid.
// kKdError when the source has none, or when they are not of the destination's format (the copy stays).
// They lie in `memory` when it is given.
KdStatus cloneElements(ChannelRecord& destination, const ChannelRecord& source, ElementValues values,
                       ElementBlocks* memory = nullptr);

}  // namespace kdreport

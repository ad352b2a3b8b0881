// The bounded text that the snapshot renderers write into.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>
#include <string_view>

#include "platform/byte_writer.h"
#include "storage/short_text.h"

namespace tbdaily {

// A value in thousandths, shown with two decimals.
struct ThousandsSplit {
  std::uint32_t whole = 0;
  std::uint32_t hundredths = 0;
};
constexpr ThousandsSplit splitThousands(std::uint32_t value) {
  return {value / 1000, value % 1000 / 10};
}

// Appends to the caller's characters and never writes at or past their capacity. A piece that leaves no room
// for the NUL is cut; nothing is appended from then on, and fits() is false. Short pieces are written as a
// whole number of bytes, so what stands behind the text within the capacity is undefined.
class SnapshotText {
 public:
  static constexpr std::size_t kWidest = 64;

  SnapshotText(char* text, std::size_t capacity) : text_(text), capacity_(capacity) {}

  bool fits() const { return fits_; }
  std::size_t length() const { return length_; }

  void append(std::string_view piece) { appendBytes(std::as_bytes(std::span(piece))); }
  void appendShort(const ShortText& piece) {
    if (space() <= ShortText::kCapacity) return append(piece.view());
    std::memcpy(text_ + length_, piece.characters().data(), ShortText::kCapacity);
    length_ += piece.size();
  }
  void appendBytes(std::span<const std::byte> piece) {
    const std::size_t count = room(piece.size());
    if (count > 0) std::memcpy(text_ + length_, piece.data(), count);
    length_ += count;
  }
  void appendFill(char fill, std::size_t times) {
    const std::size_t count = room(times);
    if (count > 0) std::memset(text_ + length_, fill, count);
    length_ += count;
  }
  // A label, then the value in unsigned decimal, filled up on the left to the width (at most kWidest).
  void appendNumber(const ShortText& label, std::uint32_t value, std::size_t width, char fill = ' ') {
    const std::size_t digits = decimalDigits(value), length = std::max(width, digits);
    if (length > kShortNumber || space() <= ShortText::kCapacity + kShortNumber) {
      appendShort(label);
      return appendLongNumber(value, length, digits, fill);
    }
    char* const at = text_ + length_;
    std::memcpy(at, label.characters().data(), ShortText::kCapacity);
    writeLittleEndian(std::as_writable_bytes(std::span(at + label.size(), kShortNumber)),
                      eightCharacters(value, digits, fill) >> 8 * (kShortNumber - length));
    length_ += label.size() + length;
  }

  // Ends the text with a NUL after `length` characters (at most length()).
  void endAt(std::size_t length) {
    if (capacity_ > 0) text_[length] = '\0';
  }

 private:
  static constexpr std::size_t kShortNumber = sizeof(std::uint64_t);

  // A number longer than eight characters, or with little room for it.
  void appendLongNumber(std::uint32_t value, std::size_t length, std::size_t digits, char fill);

  std::size_t space() const { return capacity_ - length_; }
  // How many characters of a piece may be written.
  std::size_t room(std::size_t count) {
    if (count < space()) return count;
    fits_ = false;
    return space() > 0 ? space() - 1 : 0;
  }

  char* text_;
  std::size_t capacity_;
  std::size_t length_ = 0;  // below the capacity, unless both are 0
  bool fits_ = true;
};

}  // namespace tbdaily

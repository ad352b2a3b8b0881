// The print formats in a snapshot header. They come from the controller, so they are read here and never
// reach printf.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string_view>

#include "storage/snapshot_text.h"

namespace tbdaily {

// A format read once and printed for each record. It prints as printf would, provided that it ends with a NUL
// and asks for nothing but conversions of its arguments, no more than there are of them, with C's flags and a
// width and a precision of at most SnapshotText::kWidest. Any other prints as it stands, up to its NUL.
class SnapshotFormat {
 public:
  static constexpr std::size_t kSize = 16;
  static constexpr std::size_t kMostValues = 2;

  // Which arguments the format is given: one or two numbers (d, i, u, o, x, X), or one text (s).
  enum class Arguments { kValue, kTwoValues, kText };

  SnapshotFormat() = default;
  SnapshotFormat(std::span<const char, kSize> raw, Arguments arguments);

  // The one that fits the arguments with which the format was read.
  void append(SnapshotText& out, const std::array<std::uint32_t, kMostValues>& values) const {
    for (std::size_t i = 0; i < conversionCount_; ++i)
      appendInteger(out, plain_[i], conversions_[i], values[i]);
    out.appendShort(plain_[conversionCount_]);
  }
  void append(SnapshotText& out, std::string_view argument) const;

  struct Conversion {
    char type = '\0';
    bool left = false;
    bool plus = false;
    bool space = false;
    bool alternative = false;
    bool zero = false;
    std::uint8_t width = 0;
    std::optional<std::uint8_t> precision;
    bool isUsual = false;  // %u, perhaps with a width, with zeros or spaces before the digits
  };

 private:
  bool read(std::string_view rest, Arguments arguments);
  static void appendInteger(SnapshotText& out, const ShortText& label, const Conversion& conversion,
                            std::uint32_t value) {
    if (!conversion.isUsual) return appendUnusual(out, label, conversion, value);
    out.appendNumber(label, value, conversion.width, conversion.zero ? '0' : ' ');
  }
  static void appendUnusual(SnapshotText& out, const ShortText& label, const Conversion& conversion,
                            std::uint32_t value);

  std::array<ShortText, kMostValues + 1> plain_;  // before each conversion and behind the last
  std::array<Conversion, kMostValues> conversions_{};
  std::uint8_t conversionCount_ = 0;
};

}  // namespace tbdaily

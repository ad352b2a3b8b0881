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
  void append(SnapshotText& out, const std::array<std::uint32_t, kMostValues>& values) const;
  void append(SnapshotText& out, std::string_view argument) const;

  struct Conversion {
    std::uint8_t at = 0;  // the characters of the plain text that come before
    char type = '\0';
    bool left = false;
    bool plus = false;
    bool space = false;
    bool alternative = false;
    bool zero = false;
    std::uint8_t width = 0;
    std::optional<std::uint8_t> precision;
  };

 private:
  bool read(std::string_view rest, Arguments arguments);
  template <typename Print>
  void appendPieces(SnapshotText& out, const Print& print) const;

  std::array<char, kSize> plain_{};  // without the conversions
  std::uint8_t plainLength_ = 0;
  std::uint8_t conversionCount_ = 0;
  std::array<Conversion, kMostValues> conversions_{};
};

}  // namespace tbdaily

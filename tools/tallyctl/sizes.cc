#include "tools/tallyctl/sizes.h"

#include <array>
#include <charconv>
#include <cstdio>
#include <limits>

namespace tbdaily {

namespace {
constexpr std::string_view kUnits = "KMG";
}

std::optional<std::uint64_t> parseSize(std::string_view text) {
  std::uint64_t size = 0;
  const char* end = text.data() + text.size();
  const auto [rest, error] = std::from_chars(text.data(), end, size);
  if (error != std::errc()) return std::nullopt;
  if (rest == end) return size;
  const auto unit = kUnits.find(*rest);
  if (unit == std::string_view::npos || rest + 1 != end) return std::nullopt;
  const auto shift = 10 * (unit + 1);
  if (size > std::numeric_limits<std::uint64_t>::max() >> shift) return std::nullopt;
  return size << shift;
}

std::string sizeText(std::uint64_t bytes) {
  if (bytes < 1024) return std::to_string(bytes) + (bytes == 1 ? " byte" : " bytes");
  double size = static_cast<double>(bytes) / 1024;
  std::size_t unit = 0;
  while (size >= 1024 && unit + 1 < kUnits.size()) size /= 1024, ++unit;
  std::array<char, 48> text;
  std::snprintf(text.data(), text.size(), "%.*f %ciB",
                size < 10    ? 2
                : size < 100 ? 1
                             : 0,
                size, kUnits[unit]);
  return text.data();
}

}  // namespace tbdaily

#include "storage/snapshot_text.h"

#include <array>
#include <charconv>

namespace tbdaily {

void SnapshotText::appendLongNumber(std::uint32_t value, std::size_t length, std::size_t digits, char fill) {
  std::array<char, kWidest> whole;
  const auto first = std::fill_n(whole.begin(), length - digits, fill);
  std::to_chars(first, whole.end(), value);
  append({whole.data(), length});
}

}  // namespace tbdaily

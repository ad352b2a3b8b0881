#include "storage/stats_table.h"

#include <algorithm>
#include <cstddef>
#include <limits>

namespace tbdaily {

namespace {

static_assert(std::ranges::is_sorted(kStats, std::ranges::less_equal(), &StatDefinition::id) &&
              std::ranges::adjacent_find(kStats, {}, &StatDefinition::id) == kStats.end());

constexpr std::uint16_t kNoRow = std::numeric_limits<std::uint16_t>::max();

// The identifiers are small and dense: one look tells the row.
constexpr auto kRowOfId = [] {
  std::array<std::uint16_t, kStats.back().id + 1> rows{};
  rows.fill(kNoRow);
  for (std::size_t row = 0; row < kStats.size(); ++row)
    rows[kStats[row].id] = static_cast<std::uint16_t>(row);
  return rows;
}();

}  // namespace

std::optional<std::uint16_t> findStat(std::uint32_t id) {
  if (id >= kRowOfId.size() || kRowOfId[id] == kNoRow) return std::nullopt;
  return kRowOfId[id];
}

}  // namespace tbdaily

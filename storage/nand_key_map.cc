#include "storage/nand_key_map.h"

#include <algorithm>
#include <cstddef>
#include <numeric>
#include <optional>

#include "storage/stats_table.h"

namespace tbdaily {

namespace {

struct NameRule {
  std::string_view statName;
  NandInfoRule rule;
};

// Values that do not go under a key of their own. They come before the keys.
constexpr std::array<NameRule, 13> kNameRules = {{
    {"userPartitionStart", NandInfoRule::UserPartitionStart},
    {"intermediatePartitionStart", NandInfoRule::IntermediatePartitionStart},
    {"numBootBlockRefreshSuccess0", NandInfoRule::Maintenance},
    {"numBootBlockRefreshFail0", NandInfoRule::Maintenance},
    {"mspBootBlockReadFail0", NandInfoRule::FailedRead},
    {"mspBootBlockReadFail1", NandInfoRule::FailedRead},
    {"mspBootBlockReadFail2", NandInfoRule::FailedRead},
    {"mspBootBlockProgFail0", NandInfoRule::FailedProg},
    {"mspBootBlockProgFail1", NandInfoRule::FailedProg},
    {"mspBootBlockProgFail2", NandInfoRule::FailedProg},
    {"mspBootBlockEraseFail0", NandInfoRule::FailedErase},
    {"mspBootBlockEraseFail1", NandInfoRule::FailedErase},
    {"mspBootBlockEraseFail2", NandInfoRule::FailedErase},
}};

// Every name that a statistic can be listed under has a slot: its bare name, and those of an array's elements
// right after it.
constexpr std::size_t slotsOf(const StatDefinition& stat) {
  return stat.limit > 1 ? std::size_t{1} + stat.limit : 1;
}

constexpr auto kFirstSlots = [] {
  std::array<std::uint16_t, kStats.size() + 1> slots{};
  for (std::size_t row = 0; row < kStats.size(); ++row)
    slots[row + 1] = static_cast<std::uint16_t>(slots[row] + slotsOf(kStats[row]));
  return slots;
}();

struct Slot {
  NandInfoRule rule = NandInfoRule::Ignored;
  std::uint16_t keyMapRow = 0;
};
using Slots = std::array<Slot, kFirstSlots.back()>;

constexpr std::string_view nameOfRow(std::uint16_t row) {
  return kStats[row].name;
}

// Rows of kStats in the order of their names.
constexpr auto kRowsByName = [] {
  std::array<std::uint16_t, kStats.size()> rows{};
  std::iota(rows.begin(), rows.end(), std::uint16_t{0});
  std::ranges::sort(rows, {}, nameOfRow);
  return rows;
}();

constexpr bool isDigit(char c) {
  return c >= '0' && c <= '9';
}

// Where among a statistic's slots the name with these digits after the statistic's own is; none for an index
// that the statistic does not have or that is not written in its shortest form.
constexpr std::optional<std::size_t> slotOfElement(const StatDefinition& stat, std::string_view digits) {
  if (digits.empty()) return 0;
  if (stat.limit == 1 || (digits.size() > 1 && digits.front() == '0')) return std::nullopt;
  std::size_t element = 0;
  for (const char digit : digits) {
    element = element * 10 + static_cast<std::size_t>(digit - '0');
    if (element >= stat.limit) return std::nullopt;
  }
  return element + 1;
}

// The first rule of a name holds.
constexpr void setIfFree(Slot& slot, Slot value) {
  if (slot.rule == NandInfoRule::Ignored) slot = value;
}

constexpr void setSlots(Slots& slots, std::string_view name, Slot value) {
  for (std::size_t stem = name.size(); stem > 0; --stem) {
    const std::string_view stat = name.substr(0, stem);
    const auto row = std::ranges::lower_bound(kRowsByName, stat, {}, nameOfRow);
    if (row != kRowsByName.end() && nameOfRow(*row) == stat) {
      const auto offset = slotOfElement(kStats[*row], name.substr(stem));
      if (offset) setIfFree(slots[kFirstSlots[*row] + *offset], value);
    }
    if (!isDigit(name[stem - 1])) return;
  }
}

constexpr bool isMaximumDuration(std::string_view name) {
  return name == "maxMemLowDuration" || name == "maxMemChokeDuration";
}

constexpr Slots kSlots = [] {
  Slots slots{};
  for (const NameRule& rule : kNameRules) setSlots(slots, rule.statName, {rule.rule, 0});
  for (std::size_t row = 0; row < keyMap.size(); ++row) {
    const auto rule =
        isMaximumDuration(keyMap[row].statName) ? NandInfoRule::KeyOfThreeDigits : NandInfoRule::Key;
    setSlots(slots, keyMap[row].statName, {rule, static_cast<std::uint16_t>(row)});
  }
  return slots;
}();

}  // namespace

NandInfoTarget nandInfoTarget(const StatNode& node) {
  const std::size_t offset = node.element == StatNode::kBareName ? 0 : std::size_t{1} + node.element;
  const Slot slot = kSlots[kFirstSlots[node.row] + offset];
  if (slot.rule < NandInfoRule::Key) return {slot.rule, {}};
  return {slot.rule, keyMap[slot.keyMapRow].key};
}

}  // namespace tbdaily

#include "report/key_table.h"

namespace tbdaily {

void KeyTable::set(std::string_view key, const PlistValue& options, std::uint32_t group) {
  entries_.set(key, options);
  const std::size_t position = *entries_.positionOf(key);
  if (position == groups_.size()) {
    groups_.push_back(group);
  } else {
    groups_[position] = group;
  }
}

void KeyTable::indexPrefixes() {
  std::vector<std::string_view> prefixes;
  prefixes.reserve(entries_.size());
  for (const auto& [prefix, options] : entries_) prefixes.push_back(prefix);
  prefixes_ = PrefixIndex(prefixes);
}

KeyTable::Found KeyTable::foundAt(std::size_t position) const {
  const auto& [key, options] = entries_.at(position);
  return {key, groups_[position], options.asDictionary()};
}

std::optional<KeyTable::Found> KeyTable::exact(std::string_view key) const {
  const auto position = entries_.positionOf(key);
  return position ? std::optional(foundAt(*position)) : std::nullopt;
}

std::optional<KeyTable::Found> KeyTable::firstPrefixOf(std::string_view key) const {
  const auto position = prefixes_.firstMatch(key);
  return position ? std::optional(foundAt(*position)) : std::nullopt;
}

}  // namespace tbdaily

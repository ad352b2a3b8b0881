// One look-up table of the whitelist: exact keys or key prefixes, with their options and the group that
// listed them.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/plist_value.h"
#include "report/prefix_index.h"

namespace tbdaily {

class KeyTable {
 public:
  // An entry that a look-up found, borrowed from the table.
  struct Found {
    std::string_view entry;  // the exact key, or the prefix
    std::uint32_t group = 0;
    const PlistDictionary* options =
        nullptr;  // null when they cannot be read: then no key may be reported by this entry
  };

  // A key that is there keeps its place and takes the new options and group. Options that are no dictionary
  // stand for ones that cannot be read; not none.
  void set(std::string_view key, const PlistValue& options, std::uint32_t group);
  // Once, when all prefixes are set.
  void indexPrefixes();

  std::optional<Found> exact(std::string_view key) const;
  // The first prefix in table order with which the key begins; costs the length of the key.
  std::optional<Found> firstPrefixOf(std::string_view key) const;

 private:
  Found foundAt(std::size_t position) const;

  PlistDictionary entries_;
  std::vector<std::uint32_t> groups_;  // for each entry
  PrefixIndex prefixes_;
};

}  // namespace tbdaily

// Finds, for a key, the first listed prefix with which it begins, in time that depends on the key's length
// alone.
//
// A radix tree over the prefixes: every node that ends a prefix carries the prefix's place in the list, and
// the walk along the key keeps the smallest place that it meets.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace tbdaily {

class PrefixIndex {
 public:
  // `prefixes` in listed order, each once. The empty prefix matches no key.
  explicit PrefixIndex(const std::vector<std::string_view>& prefixes = {});

  // The place in the list of the first prefix with which the key begins.
  std::optional<std::uint32_t> firstMatch(std::string_view key) const;

 private:
  static constexpr std::uint32_t kNoPlace = UINT32_MAX;

  struct Node {
    std::uint32_t labelStart = 0, labelLength = 0;  // the bytes from the parent to here, in labels_
    std::uint32_t firstChild = 0, childCount = 0;   // children stand together, in order of their first byte
    std::uint32_t place = kNoPlace;
  };
  struct Listed {
    std::string_view prefix;
    std::uint32_t place;
  };

  const Node* childFor(const Node& node, char byte) const;

  std::vector<Node> nodes_;
  std::string labels_;
};

}  // namespace tbdaily

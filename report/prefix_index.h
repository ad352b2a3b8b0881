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

  // The children of a node stand together, in order of their first byte. Where that does not take much more
  // room, each stands as far from the first as its byte from the lowest, and slots between them are empty.
  struct Node {
    std::uint32_t labelStart = 0, labelLength = 0;  // the bytes from the parent to here, in labels_; empty: 0
    std::uint32_t firstChild = 0;
    std::uint32_t place = kNoPlace;
    std::uint16_t slots = 0;  // of the children
    std::uint8_t lowest = 0;  // the first byte of the first child
    bool isSpread = false;
  };

  // The child to which the byte leads, or null.
  const Node* childFor(const Node& node, std::uint8_t byte) const;
  // The same of a node that is not spread.
  const Node* searchedChild(const Node& node, std::uint8_t byte) const;

  std::vector<Node> nodes_;
  std::string labels_;
};

}  // namespace tbdaily

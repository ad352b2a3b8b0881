#include "report/prefix_index.h"

#include <algorithm>

namespace tbdaily {

namespace {

std::size_t commonLength(std::string_view a, std::string_view b) {
  const auto limit = std::min(a.size(), b.size());
  return static_cast<std::size_t>(
      std::mismatch(a.begin(), a.begin() + static_cast<std::ptrdiff_t>(limit), b.begin()).first - a.begin());
}

std::uint8_t byteOf(char c) {
  return static_cast<std::uint8_t>(c);
}

// How many slots for each child a node may have.
constexpr std::size_t kMostSpread = 4;

}  // namespace

PrefixIndex::PrefixIndex(const std::vector<std::string_view>& prefixes) {
  struct Listed {
    std::string_view prefix;
    std::uint32_t place;
  };
  std::vector<Listed> sorted;
  sorted.reserve(prefixes.size());
  for (std::uint32_t place = 0; place < prefixes.size(); ++place) {
    if (!prefixes[place].empty()) sorted.push_back({prefixes[place], place});
  }
  std::sort(sorted.begin(), sorted.end(),
            [](const Listed& a, const Listed& b) { return a.prefix < b.prefix; });

  // Nodes whose children are still to be made, each with its run of the sorted list and its depth in bytes. A
  // worklist, since a chain of prefixes can be as deep as the longest of them.
  struct Pending {
    std::uint32_t node;
    std::size_t begin, end, depth;
  };
  nodes_.emplace_back();
  std::vector<Pending> pending{{0, 0, sorted.size(), 0}};
  std::vector<std::size_t> begins;  // of the children's runs
  while (!pending.empty()) {
    const Pending work = pending.back();
    pending.pop_back();
    const auto byteAt = [&](std::size_t i) { return byteOf(sorted[i].prefix[work.depth]); };
    begins.clear();
    for (std::size_t i = work.begin; i < work.end; ++i) {
      if (i == work.begin || byteAt(i) != byteAt(i - 1)) begins.push_back(i);
    }
    if (begins.empty()) continue;

    Node parent = nodes_[work.node];
    parent.firstChild = static_cast<std::uint32_t>(nodes_.size());
    parent.lowest = byteAt(work.begin);
    const std::size_t span = std::size_t{1} + byteAt(work.end - 1) - parent.lowest;
    parent.isSpread = span <= kMostSpread * begins.size();
    parent.slots = static_cast<std::uint16_t>(parent.isSpread ? span : begins.size());
    nodes_[work.node] = parent;
    nodes_.resize(nodes_.size() + parent.slots);
    for (std::size_t child = 0; child < begins.size(); ++child) {
      const std::size_t begin = begins[child], end = child + 1 < begins.size() ? begins[child + 1] : work.end;
      const std::size_t slot = parent.isSpread ? std::size_t{byteAt(begin)} - parent.lowest : child;
      const auto index = static_cast<std::uint32_t>(parent.firstChild + slot);
      const std::string_view first = sorted[begin].prefix;
      // The run is sorted, so its ends share what all of it shares.
      const std::size_t depth = commonLength(first, sorted[end - 1].prefix);
      nodes_[index].labelStart = static_cast<std::uint32_t>(labels_.size());
      nodes_[index].labelLength = static_cast<std::uint32_t>(depth - work.depth);
      labels_.append(first.substr(work.depth, depth - work.depth));
      const bool endsHere = first.size() == depth;
      if (endsHere) nodes_[index].place = sorted[begin].place;
      pending.push_back({index, begin + (endsHere ? 1 : 0), end, depth});
    }
  }
}

inline const PrefixIndex::Node* PrefixIndex::childFor(const Node& node, std::uint8_t byte) const {
  if (!node.isSpread) return searchedChild(node, byte);
  const std::size_t slot = std::size_t{byte} - node.lowest;  // of a lower byte, beyond all slots
  if (slot >= node.slots) return nullptr;
  const Node* const child = &nodes_[node.firstChild + slot];
  return child->labelLength > 0 ? child : nullptr;
}

const PrefixIndex::Node* PrefixIndex::searchedChild(const Node& node, std::uint8_t byte) const {
  const Node* const begin = nodes_.data() + node.firstChild;
  const Node* const end = begin + node.slots;
  const auto firstByte = [this](const Node& child) { return byteOf(labels_[child.labelStart]); };
  const Node* const found = std::ranges::lower_bound(begin, end, byte, {}, firstByte);
  return found != end && firstByte(*found) == byte ? found : nullptr;
}

std::optional<std::uint32_t> PrefixIndex::firstMatch(std::string_view key) const {
  const Node* node = nodes_.data();
  std::uint32_t place = kNoPlace;
  while (!key.empty() && (node = childFor(*node, byteOf(key.front()))) != nullptr) {
    key.remove_prefix(1);
    // Most labels are the one byte that led here. Others are compared apart, so that the way along the key
    // does not wait for the node.
    if (node->labelLength > 1) {
      const std::string_view rest(&labels_[node->labelStart + 1], node->labelLength - 1);
      if (!key.starts_with(rest)) break;
      key.remove_prefix(rest.size());
    }
    place = std::min(place, node->place);
  }
  if (place == kNoPlace) return std::nullopt;
  return place;
}

}  // namespace tbdaily

#include "report/prefix_index.h"

#include <algorithm>

namespace tbdaily {

namespace {

std::size_t commonLength(std::string_view a, std::string_view b) {
  const auto limit = std::min(a.size(), b.size());
  return static_cast<std::size_t>(
      std::mismatch(a.begin(), a.begin() + static_cast<std::ptrdiff_t>(limit), b.begin()).first - a.begin());
}

unsigned char byteOf(char c) {
  return static_cast<unsigned char>(c);
}

}  // namespace

PrefixIndex::PrefixIndex(const std::vector<std::string_view>& prefixes) {
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
  while (!pending.empty()) {
    const Pending work = pending.back();
    pending.pop_back();
    const auto firstChild = static_cast<std::uint32_t>(nodes_.size());
    for (std::size_t begin = work.begin; begin < work.end;) {
      const std::string_view first = sorted[begin].prefix;
      std::size_t end = begin + 1;
      while (end < work.end && sorted[end].prefix[work.depth] == first[work.depth]) ++end;
      // The run is sorted, so its ends share what all of it shares.
      const std::size_t depth = commonLength(first, sorted[end - 1].prefix);
      Node node;
      node.labelStart = static_cast<std::uint32_t>(labels_.size());
      node.labelLength = static_cast<std::uint32_t>(depth - work.depth);
      labels_.append(first.substr(work.depth, depth - work.depth));
      const bool endsHere = first.size() == depth;
      if (endsHere) node.place = sorted[begin].place;
      const auto index = static_cast<std::uint32_t>(nodes_.size());
      nodes_.push_back(node);
      const std::size_t rest = begin + (endsHere ? 1 : 0);
      if (rest < end) pending.push_back({index, rest, end, depth});
      begin = end;
    }
    nodes_[work.node].firstChild = firstChild;
    nodes_[work.node].childCount = static_cast<std::uint32_t>(nodes_.size()) - firstChild;
  }
}

const PrefixIndex::Node* PrefixIndex::childFor(const Node& node, char byte) const {
  const Node* begin = nodes_.data() + node.firstChild;
  const Node* end = begin + node.childCount;
  const Node* found = std::lower_bound(
      begin, end, byteOf(byte),
      [this](const Node& child, unsigned char wanted) { return byteOf(labels_[child.labelStart]) < wanted; });
  return found != end && labels_[found->labelStart] == byte ? found : nullptr;
}

std::optional<std::uint32_t> PrefixIndex::firstMatch(std::string_view key) const {
  const Node* node = nodes_.data();
  std::uint32_t place = kNoPlace;
  while (!key.empty() && (node = childFor(*node, key.front())) != nullptr) {
    const std::string_view label = std::string_view(labels_).substr(node->labelStart, node->labelLength);
    if (!key.starts_with(label)) break;
    key.remove_prefix(label.size());
    place = std::min(place, node->place);
  }
  return place == kNoPlace ? std::nullopt : std::optional(place);
}

}  // namespace tbdaily

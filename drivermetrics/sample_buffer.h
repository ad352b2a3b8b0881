// The channels of the hub's buffer.
#pragma once

#include <utility>
#include <vector>

#include "drivermetrics/raw_elements.h"
#include "platform/keyed_hash.h"

namespace kdreport {

// The channels of a sample buffer, found by their identifiers. The buffer is a chain: each channel's first
// element says how many it has, and the next channel begins behind them. The first channel with given
// identifiers counts. Quickest for channels in the order of the buffer.
class SampleBuffer {
 public:
  // How the chain ends.
  enum class End : std::uint8_t {
    Exact,     // with the buffer
    Overrun,   // a channel announces more elements than are left
    NoLength,  // a channel announces none
  };
  static constexpr std::size_t kNone = 0xFFFFFFFF;

  explicit SampleBuffer(std::span<const std::byte> buffer);

  // The channel's first element; kNone when the chain ends before such a channel. Goes along the chain no
  // farther than to it, and notes the channels that it passes.
  std::size_t find(const ChannelRecord& channel) {
    const Identifiers wanted{static_cast<std::uint64_t>(channel.driverID()),
                             static_cast<std::uint64_t>(channel.channelID())};
    const Place place = placeOf(wanted);
    if (*place.slot != kFree) return *place.slot & elementBits_;
    const std::size_t element = step();
    if (element == kNone || identifiersAt(element) != wanted) return searchFrom(element, wanted);
    note(element, place);
    return element;
  }
  ChannelType typeAt(std::size_t element) const { return {fieldAt(element, element_offset::kType)}; }
  // So many elements; none when they run over the end.
  std::span<const std::byte> elementsAt(std::size_t element, std::size_t count) const {
    const std::size_t offset = element * kElementSize, size = count * kElementSize;
    return buffer_.subspan(offset, size <= buffer_.size() - offset ? size : 0);
  }
  // Once a search went there.
  End end() const { return end_; }

 private:
  using Identifiers = std::pair<std::uint64_t, std::uint64_t>;  // driver, channel

  // Where a channel belongs in the table: the slot that holds it or is free for it, and what the slot says of
  // the channel's hash.
  struct Place {
    std::uint32_t* slot;
    std::uint32_t hash;
  };

  static constexpr std::uint32_t kFree = kNone;

  // The first element of the next channel of the chain; kNone at its end.
  std::size_t step() {
    const std::size_t element = next_;
    const std::size_t count = element < elements() ? typeAt(element).elementCount() : 0;
    if (count == 0) return endAt(element);
    next_ += count;
    return element;
  }
  std::size_t endAt(std::size_t element);
  // Goes on from a channel until one is wanted.
  std::size_t searchFrom(std::size_t element, const Identifiers& wanted);

  Place placeOf(const Identifiers& wanted) {
    const std::uint32_t hash = tbdaily::KeyedHash::of(wanted.first, wanted.second);
    const auto holds = [&](std::uint32_t slot) {
      return ((slot ^ hash) & ~elementBits_) == 0 && identifiersAt(slot & elementBits_) == wanted;
    };
    std::size_t slot = hash & lastSlot_;
    while (slots_[slot] != kFree && !holds(slots_[slot])) slot = (slot + 1) & lastSlot_;
    return {&slots_[slot], hash & ~elementBits_};
  }
  static void note(std::size_t element, const Place& place) {
    *place.slot = static_cast<std::uint32_t>(element) | place.hash;
  }

  std::size_t elements() const { return buffer_.size() / kElementSize; }
  std::uint64_t fieldAt(std::size_t element, std::size_t offset) const {
    return readWord(buffer_.subspan(element * kElementSize + offset).first<kWordSize>());
  }
  Identifiers identifiersAt(std::size_t element) const {
    return {fieldAt(element, element_offset::kProvider), fieldAt(element, element_offset::kChannel)};
  }

  std::span<const std::byte> buffer_;
  std::size_t next_ = 0;  // how far searches went along the chain
  End end_ = End::Exact;
  // Open addressing, a power of two long, at most half full. A slot holds the number of a channel's first
  // element, and in the bits that no number needs some of its hash: most other channels are told apart
  // without a look at the buffer.
  std::vector<std::uint32_t> slots_;
  std::size_t lastSlot_;
  std::uint32_t elementBits_;
};

}  // namespace kdreport

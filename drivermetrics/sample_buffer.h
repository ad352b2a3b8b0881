// The channels of the hub's buffer.
#pragma once

#include <utility>
#include <vector>

#include "drivermetrics/raw_elements.h"

namespace kdreport {

// The channels of a sample buffer, found by their identifiers. The buffer is a chain: each channel's first
// element says how many it has, and the next channel begins behind them. The first channel with given
// identifiers counts.
//
// Quickest where channels are asked for in the order of the buffer and their identifiers rise: what rises
// does not repeat, so the next channel of the chain is the first with its identifiers. From the first channel
// on of which that does not hold, a table says where the first one is.
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
  // farther than to it.
  std::size_t find(const ChannelRecord& channel) {
    const Identifiers wanted{static_cast<std::uint64_t>(channel.driverID()),
                             static_cast<std::uint64_t>(channel.channelID())};
    const std::size_t next = next_;
    if (!slots_.empty() || next >= elements() || identifiersAt(next) != wanted ||
        (next != 0 && wanted <= last_) || step() == kNone)
      return search(wanted);
    last_ = wanted;
    return next;
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

  // In the table, and from where it ends on along the chain.
  std::size_t search(const Identifiers& wanted);
  void makeTable();
  // Puts the channel into the table unless it has one with these identifiers.
  void note(const Identifiers& met, std::size_t element);
  // The slot that holds the channel's first element, or the free one where it belongs.
  std::uint32_t& slotOf(const Identifiers& wanted, std::uint32_t hash);

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
  Identifiers last_;  // of the channel before, while they rise

  // Open addressing, a power of two long, at most half full; empty until it is needed. A slot holds the
  // number of a channel's first element, and in the bits that no number needs some of its hash: most other
  // channels are told apart without a look at the buffer.
  std::vector<std::uint32_t> slots_;
  std::uint32_t elementBits_ = 0;
};

}  // namespace kdreport

// Samples: copies of the subscribed channels that carry their elements of a moment.

#include <algorithm>
#include <bit>
#include <utility>
#include <vector>

#include "drivermetrics/channel_collection.h"
#include "drivermetrics/object_blocks.h"
#include "drivermetrics/raw_elements.h"
#include "drivermetrics/report_error.h"
#include "drivermetrics/subscription.h"
#include "platform/keyed_hash.h"

namespace kdreport {

namespace {

// The channels of a sample buffer, found by their identifiers. The buffer is a chain: each channel's first
// element says how many it has, and the next channel begins behind them. The first channel with given
// identifiers counts.
class SampleBuffer {
 public:
  // How the chain ends.
  enum class End : std::uint8_t {
    Exact,     // with the buffer
    Overrun,   // a channel announces more elements than are left
    NoLength,  // a channel announces none
  };
  static constexpr std::size_t kNone = 0xFFFFFFFF;

  explicit SampleBuffer(std::span<const std::byte> buffer)
      : buffer_(buffer.first(std::min(buffer.size() / kElementSize, kNone) * kElementSize)),
        slots_(std::bit_ceil(2 * (buffer_.size() / kElementSize) + 1), kFree),
        lastSlot_(slots_.size() - 1),
        elementBits_(static_cast<std::uint32_t>(std::bit_ceil(buffer_.size() / kElementSize + 1) - 1)) {}

  // The channel's first element; kNone when the chain ends before such a channel. Goes along the chain no
  // farther than to it, and notes the channels that it passes.
  std::size_t find(const ChannelRecord& channel) {
    const Identifiers wanted{static_cast<std::uint64_t>(channel.driverID()),
                             static_cast<std::uint64_t>(channel.channelID())};
    Place place = placeOf(wanted);
    if (*place.slot != kFree) return *place.slot & elementBits_;
    std::size_t element = step();
    if (element != kNone && identifiersAt(element) != wanted) {
      element = pass(element, wanted);
      place = placeOf(wanted);
    }
    if (element != kNone) note(element, place);
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
    const std::size_t element = next_, elements = buffer_.size() / kElementSize;
    if (element >= elements) {
      end_ = element == elements ? End::Exact : End::Overrun;
      return kNone;
    }
    const std::size_t count = typeAt(element).elementCount();
    if (count == 0) {
      end_ = End::NoLength;
      return kNone;
    }
    next_ += count;
    return element;
  }

  std::uint64_t fieldAt(std::size_t element, std::size_t offset) const {
    return readWord(buffer_.subspan(element * kElementSize + offset).first<kWordSize>());
  }
  Identifiers identifiersAt(std::size_t element) const {
    return {fieldAt(element, element_offset::kProvider), fieldAt(element, element_offset::kChannel)};
  }

  // Goes on from a channel that is not wanted, to the one that is.
  std::size_t pass(std::size_t element, const Identifiers& wanted) {
    for (; element != kNone; element = step()) {
      const Identifiers met = identifiersAt(element);
      if (met == wanted) break;
      const Place place = placeOf(met);
      if (*place.slot == kFree) note(element, place);
    }
    return element;
  }

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

// Fills copies of the subscribed channels from a buffer.
class Sampler {
 public:
  explicit Sampler(std::span<const std::byte> buffer) : buffer_(buffer) {}

  std::uint32_t operator()(ChannelRecord& copy) {
    const std::size_t first = buffer_.find(copy);
    if (first == SampleBuffer::kNone) return answerForMissing();
    // Read once, then checked: the buffer may change meanwhile.
    const ChannelType type = buffer_.typeAt(first);
    const auto elements = buffer_.elementsAt(first, type.elementCount());
    if (elements.empty()) return leaveOut();
    if (copy.format() == kKdReportUnknownFormat) setChannelType(&copy, type);
    memory_.copy(elements, copy);
    return kKdReportKeep;
  }

  KdStatus status() const { return status_; }

 private:
  std::uint32_t answerForMissing() {
    switch (buffer_.end()) {
      case SampleBuffer::End::Exact:
        return leaveOut();
      case SampleBuffer::End::NoLength:
        return kKdReportStop;
      case SampleBuffer::End::Overrun:
        break;
    }
    return kKdReportKeep;
  }
  std::uint32_t leaveOut() {
    status_ = kKdNotFound;
    return kKdReportRemove;
  }

  SampleBuffer buffer_;
  ElementBlocks memory_;
  KdStatus status_ = kKdError;
};

}  // namespace

KdReportCollection KdReportCreateSamples(KdReportSubscription* subscription,
                                         const ChannelCollection* subscribedChannels,
                                         KdReportErrorOut error) {
  if (subscription == nullptr || subscribedChannels == nullptr) {
    setError(error, kKdBadArgument);
    return nullptr;
  }
  if (updateKernelBuffer(subscription, error) != kKdSuccess) return nullptr;
  return KdReportCreateSamplesRaw(subscribedChannels, subscription->buffer(), error);
}

KdReportCollection KdReportCreateSamplesRaw(const ChannelCollection* channels,
                                            std::optional<std::span<const std::byte>> buffer,
                                            KdReportErrorOut error) {
  if (channels == nullptr || !buffer || buffer->size() < kElementSize) {
    setError(error, kKdBadArgument);
    return nullptr;
  }
  Sampler sampler(*buffer);
  KdReportCollection samples = cloneAggregate(
      channels, [&sampler](const ChannelRecord&, ChannelRecord& copy) { return sampler(copy); });
  if (samples == nullptr) setError(error, sampler.status(), "couldn't create samples");
  return samples;
}

}  // namespace kdreport

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
#include "platform/byte_reader.h"
#include "platform/identifier_hash.h"

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
  struct Channel {
    ChannelType type;
    std::span<const std::byte> elements;  // empty when they run over the end
  };

  explicit SampleBuffer(std::span<const std::byte> buffer)
      : buffer_(buffer.first(std::min(buffer.size() / kElementSize, kMostElements) * kElementSize)) {
    isFirst_.resize(buffer_.size() / kElementSize);
    slots_.resize(std::bit_ceil(2 * (buffer_.size() / kElementSize) + 1), kFree);
    end_ = walkChain([this](std::size_t element) {
      std::uint32_t& slot = slotOf(identifiersAt(element));
      if (slot != kFree) return;
      slot = static_cast<std::uint32_t>(element);
      isFirst_[element] = true;
    });
  }

  // None when the chain ends before such a channel. Quickest for channels in the order of the buffer.
  std::optional<Channel> find(const ChannelRecord& channel) {
    const Identifiers wanted{static_cast<std::uint64_t>(KdReportChannelGetDriverID(&channel)),
                             static_cast<std::uint64_t>(KdReportChannelGetChannelID(&channel))};
    const bool isNext = next_ < isFirst_.size() && isFirst_[next_] && identifiersAt(next_) == wanted;
    const std::size_t element = isNext ? next_ : slotOf(wanted);
    if (element == kFree) return std::nullopt;
    // Read once, then checked: the buffer may change meanwhile.
    const ChannelType type = typeAt(element);
    next_ = element + type.elementCount();
    const std::size_t offset = element * kElementSize, size = type.elementCount() * kElementSize;
    return Channel{
        type, size <= buffer_.size() - offset ? buffer_.subspan(offset, size) : std::span<const std::byte>()};
  }
  End end() const { return end_; }

 private:
  using Identifiers = std::pair<std::uint64_t, std::uint64_t>;  // driver, channel

  static constexpr std::size_t kMostElements = 0xFFFFFFFF;
  static constexpr std::uint32_t kFree = 0xFFFFFFFF;

  // Hands the first element of each channel to the step.
  template <typename Step>
  End walkChain(const Step& step) const {
    const std::size_t end = buffer_.size() / kElementSize;
    std::size_t element = 0;
    while (element < end) {
      const std::size_t count = typeAt(element).elementCount();
      if (count == 0) return End::NoLength;
      step(element);
      element += count;
    }
    return element == end ? End::Exact : End::Overrun;
  }

  std::uint64_t fieldAt(std::size_t element, std::size_t offset) const {
    return *tbdaily::ByteReader(buffer_).at<std::uint64_t>(element * kElementSize + offset);
  }
  ChannelType typeAt(std::size_t element) const { return {fieldAt(element, element_offset::kType)}; }
  Identifiers identifiersAt(std::size_t element) const {
    return {fieldAt(element, element_offset::kProvider), fieldAt(element, element_offset::kChannel)};
  }

  // The slot that holds the channel's first element, or the free one where it belongs.
  std::uint32_t& slotOf(const Identifiers& wanted) {
    std::size_t slot = hash_(wanted.first, wanted.second) & (slots_.size() - 1);
    for (std::size_t tried = 1; tried < slots_.size(); ++tried) {
      if (slots_[slot] == kFree || identifiersAt(slots_[slot]) == wanted) break;
      slot = (slot + 1) & (slots_.size() - 1);
    }
    return slots_[slot];
  }

  std::span<const std::byte> buffer_;
  tbdaily::IdentifierHash hash_;
  End end_;
  std::vector<bool> isFirst_;         // elements that begin the first channel with its identifiers
  std::size_t next_ = 0;              // behind the channel that was found last
  std::vector<std::uint32_t> slots_;  // open addressing, a power of two long, at most half full
};

// Fills copies of the subscribed channels from a buffer.
class Sampler {
 public:
  explicit Sampler(std::span<const std::byte> buffer) : buffer_(buffer) {}

  std::uint32_t operator()(ChannelRecord& copy) {
    const auto found = buffer_.find(copy);
    if (!found) return answerForMissing();
    if (found->elements.empty()) return leaveOut();
    if (KdReportChannelGetFormat(&copy) == kKdReportUnknownFormat) setChannelType(&copy, found->type);
    copy.rawElements = memory_.copy(found->elements);
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

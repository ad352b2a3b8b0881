// Samples: copies of the subscribed channels that carry their elements of a moment.

#include <bit>
#include <unordered_map>

#include "drivermetrics/channel_collection.h"
#include "drivermetrics/raw_elements.h"
#include "drivermetrics/report_error.h"
#include "drivermetrics/subscription.h"
#include "platform/byte_reader.h"

namespace tbdaily {

namespace {

// The channels of a sample buffer, found by their identifiers. The buffer is a chain: each channel's first
// element says how many it has, and the next channel begins behind them. The first channel with given
// identifiers counts. Announced lengths are checked here, once: the buffer may change while it is read.
class SampleBuffer {
 public:
  // How the chain ends.
  enum class End : std::uint8_t {
    Exact,     // with the buffer
    Overrun,   // a channel announces more elements than are left
    NoLength,  // a channel announces none
  };
  struct Found {
    ChannelType type;
    std::span<const std::byte> elements;  // empty when they run over the end
  };

  explicit SampleBuffer(std::span<const std::byte> buffer)
      : buffer_(buffer.first(buffer.size() / kElementSize * kElementSize)) {
    const ByteReader reader(buffer_);
    std::size_t at = 0;
    for (; at < buffer_.size();) {
      const ChannelType type{*reader.at<std::uint64_t>(at + element_offset::kType)};
      if (type.elementCount() == 0) {
        end_ = End::NoLength;
        return;
      }
      const std::size_t size = type.elementCount() * kElementSize;
      const bool fits = size <= buffer_.size() - at;
      const Key key{*reader.at<std::uint64_t>(at + element_offset::kProvider),
                    *reader.at<std::uint64_t>(at + element_offset::kChannel)};
      channels_.try_emplace(key,
                            Found{type, fits ? buffer_.subspan(at, size) : std::span<const std::byte>()});
      at += size;
    }
    end_ = at == buffer_.size() ? End::Exact : End::Overrun;
  }

  // Null when the chain ends before such a channel.
  const Found* find(const ChannelRecord& channel) const {
    const auto found = channels_.find({static_cast<std::uint64_t>(KdReportChannelGetDriverID(&channel)),
                                       static_cast<std::uint64_t>(KdReportChannelGetChannelID(&channel))});
    return found != channels_.end() ? &found->second : nullptr;
  }
  End end() const { return end_; }

 private:
  struct Key {
    std::uint64_t provider, channel;
    friend bool operator==(const Key&, const Key&) = default;
  };
  struct KeyHash {
    std::size_t operator()(const Key& key) const {
      constexpr std::uint64_t kOdd = 0x9E3779B97F4A7C15;
      return (std::rotl(key.provider * kOdd, 32) ^ key.channel) * kOdd;
    }
  };

  std::span<const std::byte> buffer_;
  std::unordered_map<Key, Found, KeyHash> channels_;
  End end_ = End::Exact;
};

// Fills copies of the subscribed channels from a buffer.
class Sampler {
 public:
  explicit Sampler(std::span<const std::byte> buffer) : buffer_(buffer) {}

  std::uint32_t operator()(ChannelRecord& copy) {
    const SampleBuffer::Found* found = buffer_.find(copy);
    if (found == nullptr) return answerForMissing();
    if (found->elements.empty()) return leaveOut();
    if (KdReportChannelGetFormat(&copy) == kKdReportUnknownFormat) setChannelType(&copy, found->type);
    copy.rawElements = std::make_shared<PlistData>(found->elements.begin(), found->elements.end());
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

}  // namespace tbdaily

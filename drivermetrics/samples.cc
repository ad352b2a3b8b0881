// Samples: copies of the subscribed channels that carry their elements of a moment.

#include "drivermetrics/channel_collection.h"
#include "drivermetrics/object_blocks.h"
#include "drivermetrics/report_error.h"
#include "drivermetrics/sample_buffer.h"
#include "drivermetrics/subscription.h"

namespace kdreport {

namespace {

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
    loadAhead(elements.data(), elements.size());
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

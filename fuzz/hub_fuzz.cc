// Channels subscribed to at a hub whose buffer is the input: every getter answers within its range, deltas
// and property lists of samples hold, and nothing stays open or mapped.
#include <cmath>

#include "drivermetrics/kd_report_test_support.h"
#include "fuzz/input.h"

using namespace kdreport;
using tbdaily::fuzz::Input;
using tbdaily::fuzz::require;

namespace {

constexpr std::array<std::int32_t, 8> kOddIndices = {-1,
                                                     4,
                                                     5,
                                                     255,
                                                     65535,
                                                     65536,
                                                     std::numeric_limits<std::int32_t>::min(),
                                                     std::numeric_limits<std::int32_t>::max()};

// Few identifiers and formats, so that the buffer's elements meet the legend's channels.
std::int64_t identifierOf(Input& input) {
  return input.below(8) == 0 ? input.integer() : static_cast<std::int64_t>(0x4F4E + input.below(4));
}
ChannelType typeOf(Input& input) {
  if (input.below(8) == 0) return {input.number<std::uint64_t>()};
  return fakes::channelType(static_cast<unsigned>(input.below(6)), static_cast<unsigned>(input.below(5)),
                            0x100);
}

PlistValue infoOf(Input& input) {
  PlistDictionary info;
  if (input.flag()) info.set(kd_report_key::kChannelUnit, PlistValue::int64(input.integer()));
  if (input.flag()) {
    const auto config = input.take(input.below(49));
    info.set(kd_report_key::kChannelConfig, PlistValue::data({config.begin(), config.end()}));
  }
  return PlistValue::dictionary(std::move(info));
}

void fill(PlistData& buffer, Input& input) {
  buffer.clear();
  for (std::size_t count = input.below(12); count > 0; --count) {
    fakes::Element element{.stamp = input.number<std::uint16_t>(), .words = {}};
    for (std::size_t i = 0; i < kElementWords; ++i) element.words.push_back(input.integer());
    const auto driver = static_cast<std::int64_t>(2 + input.below(2)), channel = identifierOf(input);
    const ChannelType type = typeOf(input);
    for (std::size_t i = 0; i < std::max<std::size_t>(1, type.elementCount() % 8U); ++i) {
      element.words[0] ^= static_cast<std::int64_t>(i & 1);
      fakes::appendElement(buffer, driver, channel, type, element);
    }
  }
  const auto raw = input.section();
  buffer.insert(buffer.end(), raw.begin(), raw.end());
}

std::int32_t asIndex(std::uint32_t index) {
  return static_cast<std::int32_t>(index);
}

void checkState(const ChannelRecord* channel) {
  const std::uint32_t count = KdReportStateGetCount(channel);
  if (count == kKdReportNoIndex) return;
  const std::uint32_t current = KdReportStateGetCurrent(channel);
  require(current == kKdReportNoIndex || current < count, "the current state is one of the states");
  const std::vector<double> shares = KdReportStateCopyDutyCycles(channel);
  require(shares.empty() || shares.size() == count, "a share for each state");
  for (std::uint32_t i = 0; i < std::min(count, 64U); ++i) {
    const double share = KdReportStateGetDutyCycle(channel, asIndex(i));
    require(std::isnan(share) || (share >= 0 && share <= 1), "a share is from 0 to 1");
    if (!shares.empty())
      require(share == shares[i] || (std::isnan(share) && std::isnan(shares[i])),
              "one share is as in all of them");
    const std::int64_t id = KdReportStateGetIDForIndex(channel, asIndex(i));
    const std::uint32_t found = KdReportStateGetIndexForID(channel, id);
    if (id != kKdReportInvalid && found != kKdReportNoIndex)
      require(found >= i && found < count && KdReportStateGetIDForIndex(channel, asIndex(found)) == id,
              "an identifier leads to its highest state");
    (void)KdReportStateGetNameForIndex(channel, asIndex(i));
    (void)KdReportStateGetInTransitions(channel, asIndex(i));
    (void)KdReportStateGetResidency(channel, asIndex(i));
  }
}

void checkHistogram(const ChannelRecord* channel) {
  const std::uint32_t count = KdReportHistogramGetBucketCount(channel);
  if (count == kKdReportNoIndex) return;
  std::int64_t before = 0;
  for (std::uint32_t i = 0; i < std::min(count, 64U); ++i) {
    std::int64_t lower = 0, upper = 0;
    if (KdReportHistogramGetBucketBounds(channel, asIndex(i), &lower, &upper) == kKdSuccess) {
      require(lower == before && lower < upper, "buckets follow on each other");
      before = upper;
    }
    (void)KdReportHistogramGetBucketHits(channel, asIndex(i));
    (void)KdReportHistogramGetBucketMinValue(channel, asIndex(i));
    (void)KdReportHistogramGetBucketMaxValue(channel, asIndex(i));
    (void)KdReportHistogramGetBucketSum(channel, asIndex(i));
  }
  (void)KdReportHistogramGetMinValue(channel);
  (void)KdReportHistogramGetMaxValue(channel);
}

// What lies behind the elements, or belongs to another format, is no value.
void checkOutside(const ChannelRecord* channel) {
  const auto outside = [](std::uint32_t count, std::int32_t index) {
    return count == kKdReportNoIndex || index < 0 || static_cast<std::uint32_t>(index) >= count;
  };
  for (const std::int32_t i : kOddIndices) {
    if (outside(KdReportArrayGetCount(channel), i))
      require(KdReportArrayGetValueAtIndex(channel, i) == kKdReportInvalid, "no array value outside");
    if (outside(KdReportStateGetCount(channel), i)) {
      require(KdReportStateGetIDForIndex(channel, i) == kKdReportInvalid, "no state outside");
      require(KdReportStateGetInTransitions(channel, i) == kKdReportInvalid, "no transitions outside");
      require(KdReportStateGetResidency(channel, i) == kKdReportInvalid, "no residency outside");
      require(!KdReportStateGetNameForIndex(channel, i), "no name outside");
      require(std::isnan(KdReportStateGetDutyCycle(channel, i)), "no share outside");
    }
    if (outside(KdReportHistogramGetBucketCount(channel), i)) {
      require(KdReportHistogramGetBucketHits(channel, i) == kKdReportInvalid, "no hits outside");
      require(KdReportHistogramGetBucketSum(channel, i) == kKdReportInvalid, "no sum outside");
      std::int64_t lower = 0, upper = 0;
      require(KdReportHistogramGetBucketBounds(channel, i, &lower, &upper) != kKdSuccess,
              "no bounds outside");
    }
  }
}

void checkChannel(const ChannelRecord* channel) {
  checkState(channel);
  checkHistogram(channel);
  checkOutside(channel);
  std::int64_t unit = 0;
  const bool isSimple = KdReportChannelGetFormat(channel) == kKdReportSimple;
  const std::int64_t value = KdReportSimpleGetIntegerValue(channel, &unit);
  (void)KdReportScaleValue(static_cast<std::uint64_t>(value), unit, kKdReportSeconds);
  (void)KdReportChannelCopyDescription(channel, 0, "c: ");
  (void)KdReportSampleCopyDescription(channel, 0, nullptr);

  std::optional<ReportError> error;
  const KdReportChannel delta = KdReportSampleCreateDelta(channel, channel, &error);
  require((delta == nullptr) == error.has_value(), "an error on every failure and on failure only");
  if (delta != nullptr && isSimple && value != kKdReportInvalid)
    require(KdReportSimpleGetIntegerValue(delta.get()) == 0, "nothing changed since the same sample");
}

void checkSamples(const KdReportCollection& samples, const KdReportCollection& subscribed) {
  if (samples == nullptr) return;
  require(KdReportGetChannelCount(samples.get()) <= KdReportGetChannelCount(subscribed.get()),
          "no more samples than channels");
  KdReportIterate(samples.get(), [](ChannelRecord& channel) {
    checkChannel(&channel);
    return std::uint32_t{kKdReportKeep};
  });
  const PlistValue list = KdReportCopyPropertyList(samples.get());
  const KdReportCollection again = KdReportCreateAggregateFromPropertyList(list);
  require(again != nullptr && KdReportCopyPropertyList(again.get()) == list,
          "samples read back from their property list");
}

void sampleTwice(Input& input, fakes::FakeDriverRegistry& registry, fakes::ScriptedHub& hub) {
  const KdReportCollection channels =
      KdReportCopyAllChannels(registry, static_cast<std::uint32_t>(input.below(4)));
  if (channels == nullptr) return;
  KdReportCollection subscribed;
  std::optional<ReportError> error;
  const auto subscription =
      KdReportCreateSubscription(registry, nullptr, channels.get(), &subscribed, 0, &error);
  require((subscription == nullptr) == error.has_value(), "an error on every failure and on failure only");
  if (subscription == nullptr)
    return require(registry.openHandles() == 0 && registry.mappings == 0, "a failure leaves nothing open");
  const KdReportCollection earlier = KdReportCreateSamples(subscription.get(), subscribed.get());
  checkSamples(earlier, subscribed);
  PlistData later;
  fill(later, input);
  std::ranges::copy(std::span(later).first(std::min(later.size(), hub.buffer.size())), hub.buffer.begin());
  const KdReportCollection samples = KdReportCreateSamples(subscription.get(), subscribed.get());
  checkSamples(samples, subscribed);
  if (samples == nullptr) return;
  const KdReportCollection delta = KdReportCreateSamplesDelta(earlier.get(), samples.get());
  checkSamples(delta, subscribed);
  require(delta == nullptr || KdReportGetChannelCount(delta.get()) == KdReportGetChannelCount(samples.get()),
          "a difference for each sample");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Input input(data, size);
  KdReportSetLogSink([](std::string_view) {});
  fakes::FakeDriverRegistry registry;
  fakes::ScriptedHub hub(registry);
  if (const auto faults = input.number<std::uint8_t>(); faults < 16) {
    const auto status = [faults](unsigned bit) { return (faults & bit) != 0 ? kKdError : kKdSuccess; };
    hub.userClientOpenStatus = status(1);
    hub.configureStatus = status(2);
    hub.mapStatus = status(4);
    hub.updateStatus = status(8);
  }
  for (std::uint64_t driver = 2; driver < 4; ++driver) {
    PlistArray entries;
    for (std::size_t count = 1 + input.below(6); count > 0; --count)
      entries.push_back(fakes::legendEntry(identifierOf(input), typeOf(input)));
    registry.drivers.push_back(fakes::publishingDriver(
        driver, "D", {fakes::legendGroup("G", nullptr, infoOf(input), std::move(entries))}));
  }
  fill(hub.buffer, input);
  sampleTwice(input, registry, hub);
  require(registry.openHandles() == 0 && registry.mappings == 0, "nothing stays open or mapped");
  return 0;
}

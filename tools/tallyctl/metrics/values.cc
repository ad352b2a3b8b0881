#include "tools/tallyctl/metrics/values.h"

#include <algorithm>
#include <array>

namespace tbdaily {

using namespace kdreport;

namespace {

constexpr std::array<std::string_view, 5> kFormatNames = {"unknown", "simple", "state", "histogram", "array"};

std::optional<std::string> owned(std::optional<std::string_view> text) {
  return text ? std::optional<std::string>(*text) : std::nullopt;
}

ChannelValues readDescription(const ChannelRecord& channel) {
  ChannelValues values;
  values.driver = owned(KdReportChannelGetDriverName(&channel));
  values.driverID = KdReportChannelGetDriverID(&channel);
  values.group = owned(KdReportChannelGetGroup(&channel));
  values.subGroup = owned(KdReportChannelGetSubGroup(&channel));
  values.name = owned(KdReportChannelGetChannelName(&channel));
  values.channelID = KdReportChannelGetChannelID(&channel);
  values.format = KdReportChannelGetFormat(&channel);
  values.categories = KdReportChannelGetCategories(&channel);
  values.elementCount = KdReportChannelGetElementCount(&channel);
  values.unit = KdReportChannelGetUnit(&channel);
  values.unitLabel = owned(KdReportChannelGetUnitLabel(&channel));
  return values;
}

void readStates(const ChannelRecord& channel, ChannelValues& values) {
  values.states.resize(values.elementCount);
  const std::vector<double> shares = KdReportStateCopyDutyCycles(&channel);
  bool named = true;  // all states have names, or none has
  for (std::int32_t i = 0; i < values.elementCount; ++i) {
    StateValues& state = values.states[static_cast<std::size_t>(i)];
    state.id = KdReportStateGetIDForIndex(&channel, i);
    if (named) state.name = owned(KdReportStateGetNameForIndex(&channel, i));
    named = state.name.has_value();
    state.entries = KdReportStateGetInTransitions(&channel, i);
    state.residency = KdReportStateGetResidency(&channel, i);
    if (!shares.empty()) state.dutyCycle = shares[static_cast<std::size_t>(i)];
  }
  values.currentState = KdReportStateGetCurrent(&channel);
}

void readBuckets(const ChannelRecord& channel, ChannelValues& values) {
  values.buckets.resize(values.elementCount);
  bool bounded = true;  // bounds are for the first buckets; behind one without there are none
  for (std::int32_t i = 0; i < values.elementCount; ++i) {
    BucketValues& bucket = values.buckets[static_cast<std::size_t>(i)];
    std::int64_t lower = 0, upper = 0;
    bounded = bounded && KdReportHistogramGetBucketBounds(&channel, i, &lower, &upper) == kKdSuccess;
    if (bounded) {
      bucket.lower = lower;
      bucket.upper = upper;
    }
    bucket.hits = KdReportHistogramGetBucketHits(&channel, i);
    bucket.minimum = KdReportHistogramGetBucketMinValue(&channel, i);
    bucket.maximum = KdReportHistogramGetBucketMaxValue(&channel, i);
    bucket.sum = KdReportHistogramGetBucketSum(&channel, i);
  }
  values.minimum = KdReportHistogramGetMinValue(&channel);
  values.maximum = KdReportHistogramGetMaxValue(&channel);
}

void readArray(const ChannelRecord& channel, ChannelValues& values) {
  const std::uint32_t count = KdReportArrayGetCount(&channel);
  if (count == kKdReportNoIndex) return;
  values.array.resize(count);
  for (std::size_t i = 0; i < values.array.size(); ++i)
    values.array[i] = KdReportArrayGetValueAtIndex(&channel, static_cast<std::int32_t>(i));
}

void readValues(const ChannelRecord& channel, ChannelValues& values) {
  switch (values.format) {
    case kKdReportSimple:
      values.value = KdReportSimpleGetIntegerValue(&channel);
      break;
    case kKdReportState:
      readStates(channel, values);
      break;
    case kKdReportHistogram:
      readBuckets(channel, values);
      break;
    case kKdReportArray:
      readArray(channel, values);
      break;
    default:
      break;
  }
}

}  // namespace

std::string formatName(std::uint8_t format) {
  return format < kFormatNames.size() ? std::string(kFormatNames[format])
                                      : "format " + std::to_string(format);
}

std::optional<std::uint8_t> formatOfName(std::string_view name) {
  const auto* found = std::find(kFormatNames.begin(), kFormatNames.end(), name);
  if (found == kFormatNames.end()) return std::nullopt;
  return static_cast<std::uint8_t>(found - kFormatNames.begin());
}

std::optional<std::vector<ChannelValues>> readChannels(const ChannelCollection* collection,
                                                       ChannelContents contents) {
  std::vector<ChannelValues> channels;
  const std::uint32_t status = KdReportIterate(collection, [&](ChannelRecord& channel) {
    channels.push_back(readDescription(channel));
    if (contents == ChannelContents::Values) readValues(channel, channels.back());
    return kKdReportKeep;
  });
  if (status != 0) return std::nullopt;
  return channels;
}

}  // namespace tbdaily

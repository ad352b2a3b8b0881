// Differences between two samples of the same channels, by format.

#include "drivermetrics/channel_collection.h"
#include "drivermetrics/object_blocks.h"
#include "drivermetrics/report_error.h"
#include "drivermetrics/values.h"

namespace kdreport {

namespace {

// Elements are missing, do not fit the type, or hold a value that should not be invalid.
constexpr KdStatus kMismatch = 1;

struct DeltaFailure {
  KdStatus status;
  std::optional<std::string_view> reason;
};
using DeltaResult = std::optional<DeltaFailure>;  // none: the delta stands

constexpr DeltaFailure kMismatched{kMismatch, std::nullopt};

std::int64_t wrappingDifference(std::int64_t later, std::int64_t earlier) {
  return static_cast<std::int64_t>(static_cast<std::uint64_t>(later) - static_cast<std::uint64_t>(earlier));
}

DeltaResult simpleDelta(const ChannelRecord& earlier, const ChannelRecord& later, ChannelRecord& result) {
  const std::int64_t before = KdReportSimpleGetIntegerValue(&earlier);
  const std::int64_t after = KdReportSimpleGetIntegerValue(&later);
  auto elements = getRawElements(&result, kKdReportSimple);
  if (before == kKdReportInvalid || after == kKdReportInvalid || !elements || elements->count() != 1)
    return DeltaFailure{kKdError, std::nullopt};
  elements->setWord(0, simple_word::kValue, wrappingDifference(after, before));
  return std::nullopt;
}

// The result's elements, now a copy of the later ones; none when they are not as many as announced or not
// equally many.
std::optional<RawElements> takeLaterElements(const ChannelRecord& later, ChannelRecord& result,
                                             std::uint8_t format) {
  auto elements = announcedRawElements(&result, format);
  const auto source = getRawElements(&later, format);
  if (!elements || !source || !elements->copyFrom(*source)) return std::nullopt;
  return elements;
}

DeltaResult stateDelta(const ChannelRecord& earlier, const ChannelRecord& later, ChannelRecord& result) {
  auto elements = takeLaterElements(later, result, kKdReportState);
  if (!elements) return kMismatched;
  const auto before = announcedRawElements(&earlier, kKdReportState);
  const auto after = announcedRawElements(&later, kKdReportState);
  for (std::size_t state = 0; state < elements->count(); ++state) {
    if (!after || !before || state >= before->count()) return kMismatched;
    for (const std::size_t word : {state_word::kTransitions, state_word::kResidency}) {
      const std::int64_t from = before->word(state, word), to = after->word(state, word);
      if (from == kKdReportInvalid || to == kKdReportInvalid) return kMismatched;
      elements->setWord(state, word, wrappingDifference(to, from));
    }
  }
  return std::nullopt;
}

DeltaResult histogramDelta(const ChannelRecord& earlier, const ChannelRecord& later, ChannelRecord& result) {
  using namespace histogram_word;
  auto elements = takeLaterElements(later, result, kKdReportHistogram);
  if (!elements) return kMismatched;
  const auto before = announcedRawElements(&earlier, kKdReportHistogram);
  const auto after = announcedRawElements(&later, kKdReportHistogram);
  for (std::size_t bucket = 0; bucket < elements->count(); ++bucket) {
    if (!after || !before || bucket >= before->count()) return kMismatched;
    const std::int64_t from = before->word(bucket, kHits), to = after->word(bucket, kHits);
    if (from == kKdReportInvalid || to == kKdReportInvalid) return kMismatched;
    elements->setWord(bucket, kHits, wrappingDifference(to, from));
    // Without new hits there is nothing to sum up; a bucket without earlier hits had no sum yet.
    const std::int64_t earlierSum = from != 0 ? before->word(bucket, kSum) : 0;
    elements->setWord(
        bucket, kSum,
        from == to ? kKdReportInvalid : wrappingDifference(after->word(bucket, kSum), earlierSum));
  }
  return std::nullopt;
}

DeltaResult arrayDelta(const ChannelRecord& earlier, const ChannelRecord& later, ChannelRecord& result) {
  auto elements = getRawElements(&result, kKdReportArray);
  const auto after = getRawElements(&later, kKdReportArray);
  if (!elements || !after || !elements->copyFrom(*after)) return kMismatched;
  const auto before = getRawElements(&earlier, kKdReportArray);
  for (std::size_t element = 0; element < elements->count(); ++element) {
    for (std::size_t word = 0; word < kElementWords; ++word) {
      const bool hasEarlier = before && element < before->count();
      const std::int64_t from = hasEarlier ? before->word(element, word) : kKdReportInvalid;
      const std::int64_t to = after->word(element, word);
      if (from == kKdReportInvalid) continue;
      elements->setWord(element, word, to == kKdReportInvalid ? from : wrappingDifference(to, from));
    }
  }
  return std::nullopt;
}

// Later minus earlier into the result, which holds elements of its own of the earlier sample's number.
DeltaResult channelDelta(const ChannelRecord& earlier, const ChannelRecord& later, ChannelRecord& result) {
  const std::uint8_t format = KdReportChannelGetFormat(&later),
                     earlierFormat = KdReportChannelGetFormat(&earlier);
  if (format == kKdReportUnknownFormat || earlierFormat == kKdReportUnknownFormat)
    return DeltaFailure{kKdBadArgument, std::nullopt};
  if (format != earlierFormat) return DeltaFailure{kKdBadArgument, "mismatched formats"};
  switch (format) {
    case kKdReportSimple:
      return simpleDelta(earlier, later, result);
    case kKdReportState:
      return stateDelta(earlier, later, result);
    case kKdReportHistogram:
      return histogramDelta(earlier, later, result);
    case kKdReportArray:
      return arrayDelta(earlier, later, result);
    default:
      return DeltaFailure{kKdUnsupportedMode, "unknown report format"};
  }
}

}  // namespace

KdReportChannel KdReportSampleCreateDelta(const ChannelRecord* earlier, const ChannelRecord* later,
                                          KdReportErrorOut error) {
  const auto fail = [error](KdStatus status, std::optional<std::string_view> reason) {
    setError(error, status, reason);
    return nullptr;
  };
  if (earlier == nullptr || later == nullptr) return fail(kKdBadArgument, std::nullopt);
  const KdReportChannel result = KdReportRetainChannel(RecordBlocks().add(*earlier));
  const KdStatus cloned = cloneElements(*result, *earlier, ElementValues::Keep);
  if (cloned != kKdSuccess) return fail(cloned, std::nullopt);
  const DeltaResult failure = channelDelta(*earlier, *later, *result);
  return failure ? fail(failure->status, failure->reason) : result;
}

KdReportCollection KdReportCreateSamplesDelta(const ChannelCollection* earlier,
                                              const ChannelCollection* later, KdReportErrorOut error) {
  DeltaFailure failure{kKdError, std::nullopt};
  const auto visitor = [&failure](const ChannelRecord& partner, const ChannelRecord& channel,
                                  ChannelRecord& copy) -> std::uint32_t {
    const DeltaResult delta = channelDelta(partner, channel, copy);
    if (!delta) return kKdReportKeep;
    failure = *delta;
    return kKdReportStop;
  };
  KdReportCollection result = compareAggregates(earlier, later, visitor);
  if (result == nullptr) setError(error, failure.status, failure.reason);
  return result;
}

}  // namespace kdreport

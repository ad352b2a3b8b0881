#include <gmock/gmock.h>

#include <cmath>

#include "drivermetrics/metrics_test_support.h"
#include "platform/byte_writer.h"

namespace kdreport {
namespace {

using testing::channelType, testing::Element, testing::sampled;

constexpr std::int64_t kNone = kKdReportInvalid;
constexpr std::int64_t kOn = 0x4F4E, kOff = 0x4F4646;

std::vector<std::int64_t> wordsOf(const ChannelRecord* channel) {
  std::vector<std::int64_t> words;
  const auto elements = getRawElements(channel, KdReportChannelGetFormat(channel));
  for (std::size_t i = 0; elements && i < elements->count() * kElementWords; ++i)
    words.push_back(elements->word(i / kElementWords, i % kElementWords));
  return words;
}

TEST(Values, SimpleAndArray) {
  const auto simple = sampled(channelType(1), {{1, {-42}}}, {{"KdReportChannelUnit", PlistValue::int64(7)}});
  std::int64_t unit = 0;
  EXPECT_EQ(KdReportSimpleGetIntegerValue(simple.get(), &unit), -42);
  EXPECT_EQ(unit, 7);
  ASSERT_EQ(setChannelType(simple.get(), channelType(2, 9)), kKdSuccess);
  EXPECT_EQ(KdReportSimpleGetIntegerValue(simple.get()), -42) << "the elements say how they are read";
  EXPECT_EQ(KdReportSimpleGetIntegerValue(nullptr, &unit), kNone);
  EXPECT_EQ(unit, kNone);

  const auto array = sampled(channelType(4, 2), {{1, {1, 2, 3, 4}}, {1, {5, 6, 7, 8}}});
  const std::vector<std::pair<std::int32_t, std::int64_t>> places = {
      {0, 1}, {7, 8}, {8, kNone}, {-1, kNone}, {INT32_MAX, kNone}};
  for (const auto& [index, value] : places)
    EXPECT_EQ(KdReportArrayGetValueAtIndex(array.get(), index), value) << index;
  EXPECT_EQ(KdReportArrayGetCount(array.get()), 8U);
  EXPECT_EQ(KdReportArrayGetCount(simple.get()), kKdReportNoIndex);
  EXPECT_EQ(KdReportArrayGetValueAtIndex(simple.get(), 0), kNone);
}

TEST(Values, Histogram) {
  const auto histogram =
      sampled(channelType(3, 3), {{1, {0, 9, 9, 9}}, {1, {2, 11, 19, 30}}, {1, {0, 7, 8, 9}}});
  EXPECT_EQ(KdReportHistogramGetBucketCount(histogram.get()), 3U);
  EXPECT_EQ(KdReportHistogramGetBucketSum(histogram.get(), 1), 30);
  EXPECT_EQ(KdReportHistogramGetBucketHits(histogram.get(), 3), kNone);
  EXPECT_EQ(KdReportHistogramGetMinValue(histogram.get()), 11);
  EXPECT_EQ(KdReportHistogramGetMaxValue(histogram.get()), 19);
  EXPECT_EQ(KdReportStateGetCount(histogram.get()), kKdReportNoIndex);
}

struct Segment {
  std::uint32_t base, progression, buckets;
};
PlistData bucketConfig(const std::vector<Segment>& segments) {
  PlistData bytes;
  for (const Segment& segment : segments) {
    tbdaily::appendLittleEndian(bytes, segment.base | std::uint64_t{segment.progression} << 32);
    tbdaily::appendLittleEndian(bytes, 0xFFFFFFFF | std::uint64_t{segment.buckets} << 32);
  }
  return bytes;
}

TEST(Values, HistogramBounds) {
  const std::vector<std::pair<std::vector<Segment>, std::vector<std::int64_t>>> cases = {
      {{{10, 0, 3}}, {10, 20, 30}},
      {{{2, 1, 4}}, {2, 4, 8, 16}},
      {{{1, 0, 2}, {9, 0, 0}, {7, 0, 0xFFFFFFFF}, {10, 5, 2}}, {1, 2, 10, 100}},
      {{{0, 0, 1}}, {}},               // the first bound has to be above 0
      {{{10, 0, 2}, {20, 0, 1}}, {}},  // and every other above its predecessor
      {{{1, 1, 2}}, {}},
      {{{10, 0, 6}}, {}},  // more than the five buckets
      {{{10, 0, 0x7FFFFFFF}}, {}},
      {{{0x80000000, 0, 2}}, {}},  // 32-bit arithmetic: the second bound is 0
      {{{0x80000000, 1, 2}}, {0x80000000, 0x4000000000000000}},
      {{{0xFFFFFFFF, 1, 2}}, {}},  // the second bound is negative
      {{}, {}}};
  for (std::size_t row = 0; row < cases.size(); ++row) {
    const auto& [segments, bounds] = cases[row];
    SCOPED_TRACE("row " + std::to_string(row));
    const auto histogram = sampled(channelType(3, 5), std::vector<Element>(5),
                                   {{"KdReportChannelConfig", PlistValue::data(bucketConfig(segments))}});
    std::vector<std::int64_t> found;
    std::int64_t lower = 0, upper = 0;
    for (std::int32_t i = 0;
         KdReportHistogramGetBucketBounds(histogram.get(), i, &lower, &upper) == kKdSuccess; ++i) {
      EXPECT_EQ(lower, i == 0 ? 0 : found.back());
      found.push_back(upper);
    }
    EXPECT_EQ(found, bounds);
    EXPECT_EQ(histogram->cached(CachedAnswer::ProcessedChannelConfig).isNone(), bounds.empty())
        << "only what is right is cached";
    EXPECT_EQ(KdReportHistogramGetBucketBounds(histogram.get(), -1, nullptr, nullptr), kKdError);
  }
}

TEST(Values, States) {
  const auto states = sampled(channelType(2, 3), {{5, {kOff, 1, 1}}, {9, {kOn, 2, 3}}, {9, {kOff, 3, 0}}});
  EXPECT_EQ(KdReportStateGetInTransitions(states.get(), 2), 3);
  EXPECT_EQ(KdReportStateGetIndexForID(states.get(), kOff), 2U);
  EXPECT_EQ(KdReportStateGetCurrent(states.get()), 1U);
  EXPECT_EQ(KdReportStateGetDutyCycle(states.get(), 1), 0.75);
  EXPECT_THAT(KdReportStateCopyDutyCycles(states.get()), ::testing::ElementsAre(0.25, 0.75, 0));
  EXPECT_EQ(KdReportStateGetNameForIndex(states.get(), 0), "OFF");

  const auto idle = sampled(channelType(2, 2), {{0, {kOn, 0, 0}}, {0, {1, 0, 0}}});
  EXPECT_EQ(KdReportStateGetCurrent(idle.get()), kKdReportNoIndex);
  EXPECT_TRUE(std::isnan(KdReportStateGetDutyCycle(idle.get(), 0)));
  EXPECT_EQ(KdReportStateGetNameForIndex(idle.get(), 0), std::nullopt)
      << "one state without a name, no names";
  EXPECT_TRUE(idle->cached(CachedAnswer::StateNames).isNone());
}

TEST(Values, OfElementsOfEveryLengthAndFormat) {
  for (unsigned format = 0; format <= 5; ++format) {
    const auto whole = sampled(channelType(format, 2), {{1, {kOn, 1, 2, 3}}, {2, {kOff, 4, 5, 6}}},
                               {{"KdReportChannelConfig", PlistValue::data(bucketConfig({{10, 0, 2}}))}});
    for (unsigned announced = 0; announced <= 3; ++announced) {
      for (unsigned carried = 0; carried <= 5; ++carried) {  // the format that the elements carry
        for (std::size_t length = 0; length <= 2 * kElementSize; length += 7) {
          const auto channel = sampled(channelType(format, announced), {});
          channel->source->block->group = whole->source->block->group;
          PlistData bytes(whole->elements().begin(), whole->elements().end());
          bytes[16] = static_cast<std::byte>(carried);
          channel->copyElements(std::span(bytes).first(length));
          const std::size_t elements = length / kElementSize;
          const bool isReadable = elements > 0 && carried == format;
          const bool isComplete = isReadable && elements == announced;
          const auto is = [format](unsigned f, bool condition) { return format == f && condition; };
          const ChannelRecord* c = channel.get();
          SCOPED_TRACE("format " + std::to_string(format) + ", announced " + std::to_string(announced) +
                       ", carried " + std::to_string(carried) + ", length " + std::to_string(length));
          EXPECT_EQ(KdReportSimpleGetIntegerValue(c) != kNone, carried == 1 && elements == 1);
          EXPECT_EQ(KdReportArrayGetValueAtIndex(c, 4) != kNone, carried == 4 && elements > 1);
          EXPECT_EQ(KdReportHistogramGetBucketHits(c, 0) != kNone, is(3, isComplete));
          EXPECT_EQ(KdReportHistogramGetMinValue(c) != kNone, is(3, isComplete));
          EXPECT_EQ(KdReportHistogramGetMaxValue(c) != kNone, is(3, isComplete));
          EXPECT_EQ(KdReportStateGetResidency(c, 0) != kNone, is(2, isComplete));
          EXPECT_EQ(KdReportStateGetNameForIndex(channel.get(), 0).has_value(), is(2, isComplete));
          EXPECT_EQ(KdReportStateGetCurrent(c) != kKdReportNoIndex, is(2, isComplete));
          EXPECT_EQ(KdReportSampleCreateDelta(c, c) != nullptr, is(1, isReadable && elements == 1) ||
                                                                    is(4, isReadable) || is(2, isComplete) ||
                                                                    is(3, isComplete));
          EXPECT_EQ(
              KdReportSampleCopyDescription(channel.get(), 0, "").has_value(),
              isReadable && format >= 1 && format <= 4 && (format != 3 || (isComplete && announced == 2)));
        }
      }
    }
  }
}

struct DeltaCase {
  KdReportChannel earlier, later;
  std::vector<std::int64_t> words;  // empty: the delta fails
  std::string reason = {};
  KdStatus code = 0;
};

TEST(Deltas, FollowTheRulesOfEachFormat) {
  const std::string none = "createPVErr() passed a NULL string!";
  const auto simple = [](std::int64_t value) { return sampled(channelType(1), {{1, {value}}}); };
  const auto make = [](unsigned format, const std::vector<Element>& elements) {
    return sampled(channelType(format, static_cast<unsigned>(elements.size())), elements);
  };
  const std::vector<DeltaCase> cases = {
      {simple(100), simple(250), {150, 0, 0, 0}},
      {simple(250), simple(100), {-150, 0, 0, 0}},
      {simple(INT64_MAX), simple(-2), {INT64_MAX, 0, 0, 0}},
      {simple(kNone), simple(1), {}, none, kKdError},
      {make(2, {{1, {kOn, 2, 30, 4}}}), make(2, {{5, {kOff, 7, 50, 6}}}), {kOff, 5, 20, 6}},
      {make(2, {{1, {kOn, kNone, 0}}}), make(2, {{1, {kOn, 1, 1}}}), {}, none, 1},
      {make(2, {{}}), make(2, {{}, {}}), {}, none, 1},
      // Hits moved; the same; none before.
      {make(3, {{1, {2, 1, 9, 10}}, {1, {3, 1, 1, 3}}, {1, {0, 7, 7, 7}}}),
       make(3, {{1, {5, 2, 8, 31}}, {1, {3, 1, 1, 3}}, {1, {1, 5, 5, 5}}}),
       {3, 2, 8, 21, 0, 1, 1, kNone, 1, 5, 5, 5}},
      {make(3, {{1, {kNone}}}), make(3, {{1, {1}}}), {}, none, 1},
      {make(4, {{1, {1, kNone, 3, kNone}}}), make(4, {{1, {11, 12, kNone, kNone}}}), {10, 12, 3, kNone}},
      {make(4, {{}}), make(4, {{}, {}}), {}, none, 1},
      {make(1, {{}}), make(4, {{}}), {}, "mismatched formats", kKdBadArgument},
      {make(0, {{}}), make(4, {{}}), {}, none, kKdBadArgument},
      {make(5, {{}}), make(5, {{}}), {}, "unknown report format", kKdUnsupportedMode},
  };
  for (std::size_t row = 0; row < cases.size(); ++row) {
    const DeltaCase& c = cases[row];
    SCOPED_TRACE("row " + std::to_string(row));
    const auto before = wordsOf(c.earlier.get()), after = wordsOf(c.later.get());
    std::optional<ReportError> error;
    const KdReportChannel delta = KdReportSampleCreateDelta(c.earlier.get(), c.later.get(), &error);
    EXPECT_EQ(wordsOf(delta.get()), c.words);
    EXPECT_EQ(error ? error->reason : "", c.reason);
    EXPECT_EQ(error ? error->code : 0, c.code);
    EXPECT_EQ(wordsOf(c.earlier.get()), before);
    EXPECT_EQ(wordsOf(c.later.get()), after);
  }
  EXPECT_EQ(KdReportSampleCreateDelta(nullptr, simple(1).get()), nullptr);
}

}  // namespace
}  // namespace kdreport

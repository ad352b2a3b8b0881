#include <gmock/gmock.h>

#include <cmath>

#include "platform/plist_text.h"
#include "report/distribution_summary.h"
#include "report/scalar_rounding.h"

namespace tbdaily {
namespace {

constexpr std::int64_t kMax = std::numeric_limits<std::int64_t>::max();
constexpr std::int64_t kMin = std::numeric_limits<std::int64_t>::min();

TEST(ScalarRounding, FollowsIntervalThenFigures) {
  using Option = std::optional<std::int64_t>;
  const Option none;
  // In turn: 2^64 wraps to a negative number; intervals of 2^64 - 1 and 2^64 - 2, of which half is not
  // reached and reached; and ten to the power of a thousand, which leaves nothing.
  const std::tuple<std::int64_t, Option, Option, std::int64_t> cases[] = {
      {14, 10, none, 10},
      {15, 10, none, 20},
      {7, 0, none, 0},
      {-4, 10, none, 0},
      {-5, 10, none, -10},
      {kMin, 10, none, kMin},
      {kMax, 10, none, -9223372036854775806},
      {5, -1, none, 0},
      {kMax, -2, none, -2},
      {999, none, 2, 1000},
      {45, none, 1, 50},
      {-150, none, 1, -200},
      {5, none, 0, 10},
      {0, none, 1, 0},
      {kMax, none, 0, kMax},
      {kMin, none, 0, kMin},
      {7, none, -1000, 0},
      {1536, 1024, 1, 2000},
      {kMin, none, none, kMin}};
  for (const auto& [value, interval, figures, expected] : cases) {
    PlistDictionary options{{"unknown", PlistValue::int64(3)}};
    if (interval) options.set("bucket_interval", PlistValue::int64(*interval));
    if (figures) options.set("sig_fig", PlistValue::int64(*figures));
    EXPECT_EQ(roundedScalar(value, options), expected)
        << value << " " << interval.value_or(-99) << " " << figures.value_or(-99);
  }
}

std::vector<double> statisticsOf(const std::vector<double>& values) {
  DistributionSummary summary;
  for (const double value : values) summary.add(value);
  std::vector<double> numbers;
  const PlistValue statistics = summary.statistics();
  for (const PlistValue& number : *statistics.asArray()) numbers.push_back(number.asNumber()->toDouble());
  return numbers;
}

TEST(DistributionSummary, KeepsFiveFigures) {
  using ::testing::DoubleEq;
  using ::testing::ElementsAre;
  EXPECT_THAT(statisticsOf({}), ElementsAre(0, 0, 0, 0, 0));
  EXPECT_THAT(statisticsOf({-2.5}), ElementsAre(-2.5, -2.5, -2.5, 0, 1));
  EXPECT_THAT(statisticsOf({2, 4, 4, 4, 5, 5, 7, 9}), ElementsAre(2, 9, 5, DoubleEq(32), 8));
  const auto odd = statisticsOf({1, std::nan(""), 0.5});
  EXPECT_EQ(odd[0], 0.5);
  EXPECT_TRUE(std::isnan(odd[2]));
  EXPECT_EQ(odd[4], 3);
  EXPECT_TRUE(std::isnan(statisticsOf({1, std::nan("")})[1]));
  EXPECT_EQ(DistributionSummary().statistics().asArray()->at(4).asNumber()->kind(), NumberKind::SInt32);
}

// Computed with another implementation that rounds after every operation. Compiled to fused operations, the
// sum of squared deviations differs.
TEST(DistributionSummary, HasTheSameLastDigitsOnEveryProcessor) {
  std::vector<double> values;
  for (int i = 0; i < 40; ++i) values.push_back(0.1 * i * i - 7.3 + 1e6 / (i + 1));
  const auto figures = statisticsOf(values);
  EXPECT_EQ(figures[2], 0x1.a1ffa03fcb199p+16);
  EXPECT_EQ(figures[3], 0x1.0e9eca6ae5177p+40);
}

TEST(Histogram, BucketsAreClosedAboveAndInTheGivenOrder) {
  const double ascending[] = {10, 100};
  const std::pair<double, std::uint32_t> cases[] = {{-5, 0},  {10, 0},  {10.5, 1},
                                                    {100, 1}, {101, 2}, {std::nan(""), 2}};
  for (const auto& [value, bucket] : cases) {
    EXPECT_EQ(determineHistBucketForValueWithIntervals(value, ascending), bucket) << value;
  }
  const double unsorted[] = {100, 10};
  EXPECT_EQ(determineHistBucketForValueWithIntervals(5, unsorted), 0U);
  EXPECT_EQ(determineHistBucketForValueWithIntervals(5, {}), 0U);
}

TEST(Histogram, LabelsShowTheBoundariesOwnText) {
  const PlistArray boundaries = {PlistValue::int64(10), PlistValue::float64(2.5),
                                 PlistValue::float64(100000)};
  const std::uint64_t counts[] = {1, 2, 0, 3};
  EXPECT_EQ(plistText(histogramDictForIntervalsWithHistCounts(boundaries, counts)),
            "{\"(-inf, 10]\": 1, \"(10, 2.5]\": 2, \"(100000, inf)\": 3}");
  EXPECT_EQ(plistText(histogramDictForIntervalsWithHistCounts({}, std::array{std::uint64_t{4}})),
            "{\"(-inf, inf)\": 4}");
  EXPECT_TRUE(histogramDictForIntervalsWithHistCounts({}, std::array{std::uint64_t{0}}).isNone());
}

}  // namespace
}  // namespace tbdaily

#include "tools/tallyctl/report/daily_report.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>

namespace tbdaily {
namespace {

TEST(DailyReport, ALabelIsReadAsItsBounds) {
  const auto inner = bucketBounds("(2.5, 10]");
  ASSERT_TRUE(inner);
  EXPECT_EQ(inner->lower, 2.5);
  EXPECT_EQ(inner->upper, 10);
  EXPECT_EQ(inner->upperText, "10");
  const auto all = bucketBounds("(-inf, inf)");
  ASSERT_TRUE(all);
  EXPECT_EQ(all->lower, -std::numeric_limits<double>::infinity());
  EXPECT_EQ(all->upper, std::numeric_limits<double>::infinity());
  for (const char* text :
       {"", "(", "(1, ", "(1, ]", "[1, 2]", "(1,2]", "(1, 2", "(1, nan]", "(a, 2]", "(1, 2x]"})
    EXPECT_FALSE(bucketBounds(text)) << text;
}

TEST(DailyReport, BucketsAscendAndGapsAreFilled) {
  const auto count = [](std::int64_t n) { return PlistValue::int64(n); };
  const PlistValue histogram = PlistValue::dictionary(
      {{"(20, inf)", count(1)}, {"(-inf, 5]", count(2)}, {"no bucket", count(9)}, {"(5, 7]", count(3)}});
  const PlistValue root =
      PlistValue::dictionary({{"TBCrashLogVersion", count(2)},
                              {"TBStartDate", PlistValue(PlistDate{})},
                              {"TBDistributionsHistogram", PlistValue::dictionary({{"k", histogram}})}});
  const auto report = DailyReport::decode(root);
  ASSERT_TRUE(report);
  std::string all;
  for (const HistogramBucket& bucket : report->buckets("k"))
    all += bucket.label() + std::to_string(bucket.count) + " ";
  EXPECT_EQ(all, "(-inf, 5]2 (5, 7]3 (7, 20]0 (20, inf)1 ");
  EXPECT_TRUE(report->buckets("other").empty());
  EXPECT_FALSE(DailyReport::decode(histogram));
}

TEST(DailyReport, StatisticsAreFiveNumbers) {
  const auto number = [](double n) { return PlistValue::float64(n); };
  const auto statistics = distributionStatistics(
      PlistValue::array({number(1), number(3), number(2), number(8), PlistValue::int32(2)}));
  ASSERT_TRUE(statistics);
  EXPECT_EQ(statistics->standardDeviation(), 2);
  EXPECT_EQ(DistributionStatistics{}.standardDeviation(), 0);
  EXPECT_FALSE(distributionStatistics(PlistValue::array({number(1), number(3), number(2), number(8)})));
}

}  // namespace
}  // namespace tbdaily

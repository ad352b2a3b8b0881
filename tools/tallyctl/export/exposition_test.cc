#include "tools/tallyctl/export/exposition.h"

#include <gtest/gtest.h>

#include <limits>

#include "tools/tallyctl/export/textfile.h"

namespace tbdaily {
namespace {

constexpr MetricDescription kGauge{"g", "gauge", "A gauge."};
constexpr MetricDescription kHistogram{"h", "histogram", "A histogram."};

TEST(Exposition, LabelsAreEscapedAndTheFirstOfEqualOnesCounts) {
  std::string text;
  {
    Metric gauge(text, kGauge);
    gauge.add({{"key", "a\"\\\nb\tü"}}, std::int64_t{1});
    gauge.add({{"key", std::string_view("\0", 1)}}, std::numeric_limits<double>::quiet_NaN());
    gauge.add({{"key", "\xff"}}, -std::numeric_limits<double>::infinity());
    gauge.add({{"key", "x"}, {"other", ""}}, std::numeric_limits<std::int64_t>::min());
  }
  Metric(text, kHistogram);
  EXPECT_EQ(text,
            "# HELP g A gauge.\n# TYPE g gauge\n"
            "g{key=\"a\\\"\\\\\\nb\tü\"} 1\n"
            "g{key=\"\xEF\xBF\xBD\"} NaN\n"
            "g{key=\"x\",other=\"\"} -9223372036854775808\n");
}

TEST(Exposition, BucketsAddUpAndEndInInfinity) {
  constexpr double kInfinity = std::numeric_limits<double>::infinity();
  std::string text;
  Metric histogram(text, kHistogram);
  histogram.add({{"key", "k"}}, {{-kInfinity, 0}, {2.5, 3}, {10, 0}}, 7.5);
  histogram.add({}, {{kInfinity, 2}}, kInfinity);
  EXPECT_EQ(
      text,
      "# HELP h A histogram.\n# TYPE h histogram\n"
      "h_bucket{key=\"k\",le=\"2.5\"} 3\nh_bucket{key=\"k\",le=\"10\"} 3\nh_bucket{key=\"k\",le=\"+Inf\"} 3\n"
      "h_sum{key=\"k\"} 7.5\nh_count{key=\"k\"} 3\n"
      "h_bucket{le=\"+Inf\"} 2\nh_sum +Inf\nh_count 2\n");
}

TEST(ReportMetrics, GapsKeepTheirBoundsAndWhatIsNoHistogramIsLeftOut) {
  const auto count = [](std::int64_t n) { return PlistValue::int64(n); };
  const auto real = [](double n) { return PlistValue::float64(n); };
  const PlistValue statistics = PlistValue::array({real(1), real(60), real(20.5), real(8), count(4)});
  const PlistValue buckets = PlistValue::dictionary({{"(50, inf)", count(1)}, {"(10, 20]", count(3)}});
  const PlistValue root = PlistValue::dictionary(
      {{"TBCrashLogVersion", count(1)},
       {"TBStartDate", PlistValue(PlistDate::fromUnixSeconds(1795392000))},
       {"TBScalars", PlistValue::dictionary({{"s", count(-3)}, {"no number", PlistValue::string("3")}})},
       {"TBDistributions", PlistValue::dictionary({{"d", statistics}, {"bad", statistics}})},
       {"TBDistributionsHistogram",
        PlistValue::dictionary({{"d", buckets},
                                {"bad", PlistValue::dictionary({{"(1, 2]", count(-1)}})},
                                {"alone", buckets}})}});
  std::string text;
  EXPECT_EQ(appendReportMetrics(text, *DailyReport::decode(root)),
            "entries that are left out, since they are no scalars, distributions or histograms: 3");
  EXPECT_NE(text.find("tbdaily_report_day_timestamp_seconds 1795392000\n"), std::string::npos);
  EXPECT_NE(text.find("tbdaily_scalar{key=\"s\"} -3\n"), std::string::npos);
  EXPECT_NE(text.find("\ntbdaily_distribution_bucket{key=\"d\",le=\"10\"} 0\n"
                      "tbdaily_distribution_bucket{key=\"d\",le=\"20\"} 3\n"
                      "tbdaily_distribution_bucket{key=\"d\",le=\"50\"} 3\n"
                      "tbdaily_distribution_bucket{key=\"d\",le=\"+Inf\"} 4\n"
                      "tbdaily_distribution_sum{key=\"d\"} 82\ntbdaily_distribution_count{key=\"d\"} 4\n"),
            std::string::npos);
  EXPECT_EQ(text.find("_bucket{key=\"bad\""), std::string::npos);
}

}  // namespace
}  // namespace tbdaily

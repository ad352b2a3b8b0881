#include <gtest/gtest.h>

#include <algorithm>
#include <limits>
#include <string>
#include <string_view>

#include "tools/tallyctl/page/chart_scale.h"
#include "tools/tallyctl/page/figures.h"
#include "tools/tallyctl/page/html.h"
#include "tools/tallyctl/page/report_page.h"
#include "tools/tallyctl/page/wear_page.h"
#include "tools/tallyctl/wear/wear_history_test_support.h"

namespace tbdaily {
namespace {

using testing::recorded;

constexpr double kInfinity = std::numeric_limits<double>::infinity();

std::size_t timesIn(std::string_view text, std::string_view part) {
  std::size_t times = 0;
  for (std::size_t at = text.find(part); at != std::string_view::npos; at = text.find(part, at + 1)) ++times;
  return times;
}

template <typename Number>
std::string figure(Number value) {
  HtmlWriter page;
  writeFigure(page, value);
  return page.take();
}

TEST(Html, NoTextBecomesMarkup) {
  HtmlWriter page;
  page.markup("<p title=\"")
      .text("a\" onload='x'")
      .markup("\">")
      .text("<b>&amp;\x1b\xFF\u202e\nü</b>")
      .markup("</p>");
  EXPECT_EQ(
      page.take(),
      "<p title=\"a&quot; onload=&#39;x&#39;\">&lt;b&gt;&amp;amp;\\x1b\\xff\\u202e\\x0aü&lt;/b&gt;</p>");
}

TEST(Figures, WhatIsShortenedCarriesTheWhole) {
  EXPECT_EQ(figure(std::int64_t{-999}), "-999");
  EXPECT_EQ(figure(std::numeric_limits<std::int64_t>::min()),
            "<data value=\"-9223372036854775808\">-9,223,372,036,854,775,808</data>");
  EXPECT_EQ(figure(2.5), "2.5");
  EXPECT_EQ(figure(1234.56789), "<data value=\"1234.56789\">1,234.57</data>");
  EXPECT_EQ(figure(1e300), "1e+300");
  EXPECT_EQ(figure(-kInfinity), "<data value=\"-inf\">-\u221e</data>");
  EXPECT_EQ(scaleText(25000, "B") + " " + scaleText(999.7, "") + " " + scaleText(0, "B"), "25 kB 1k 0 B");
  EXPECT_EQ(driveSizeText(1.5e12) + " " + driveSizeText(999.6) + " " + driveSizeText(12),
            "1.50 TB 1.00 kB 12 B");
}

TEST(ChartScale, ReachesTheLargestInFewRoundSteps) {
  const struct {
    double smallest, largest;
    bool isWhole;
    double base, step;
    int steps;
  } kCases[] = {{0, 0, true, 0, 1, 1},         {0, 3, true, 0, 1, 3},       {0, 1234, true, 0, 500, 3},
                {0, 0.5, false, 0, .1, 5},     {131, 152, true, 130, 5, 5}, {7, 7, true, 7, 1, 1},
                {0, 1e300, false, 0, 2e299, 5}};
  for (const auto& c : kCases) {
    const ChartScale scale = chartScale(c.smallest, c.largest, c.isWhole);
    EXPECT_DOUBLE_EQ(scale.base, c.base) << c.largest;
    EXPECT_DOUBLE_EQ(scale.step, c.step) << c.largest;
    EXPECT_EQ(scale.steps, c.steps) << c.largest;
    EXPECT_LE(scale.share(c.largest), 1);
  }
}

TEST(ReportPage, HasABarForEachBucketThatIsNotEmptyAndTheSameBytesEachTime) {
  const auto number = [](std::int64_t n) { return PlistValue::int64(n); };
  const auto real = [](double n) { return PlistValue::float64(n); };
  const PlistValue buckets = PlistValue::dictionary(
      {{"(-inf, 5]", number(2)}, {"(7, 9]", number(100000)}, {"(9, inf)", number(1)}, {"<b>", number(4)}});
  const PlistValue root = PlistValue::dictionary(
      {{"TBCrashLogVersion", number(1)},
       {"TBStartDate", PlistValue(PlistDate{kInfinity})},
       {"TBScalars", PlistValue::dictionary({{"</style><script>", PlistValue::string("<i>")}})},
       {"TBDistributions",
        PlistValue::dictionary(
            {{"k&k", PlistValue::array({real(1), real(9.5), real(8), real(kInfinity), number(100003)})},
             {"odd", PlistValue::array({})}})},
       {"TBDistributionsHistogram",
        PlistValue::dictionary({{"k&k", buckets}, {"alone", PlistValue::array({})}})},
       {"TBTasking",
        PlistValue::array({number(1), PlistValue::dictionary({{"Key", PlistValue::string("K")}})})}});
  const auto report = DailyReport::decode(root);
  ASSERT_TRUE(report);
  const std::string page = reportPage(*report, ReportStanding::Written);
  EXPECT_EQ(page, reportPage(*report, ReportStanding::Written));
  EXPECT_EQ(timesIn(page, "<rect "), 3U);
  EXPECT_EQ(timesIn(page, "aria-label=\"Histogram of k&amp;k\""), 1U);
  EXPECT_EQ(timesIn(page, "<td class=\"n\"><data value=\"100000\">100,000</data></td>"), 1U);
  EXPECT_EQ(timesIn(page, "<script"), 0U);
  EXPECT_EQ(timesIn(page, "removed"), 1U);
  EXPECT_NE(page, reportPage(*report, ReportStanding::WouldLeave));
}

TEST(WearPage, BreaksItsLinesAtGapsAndWhereCountersWentBack) {
  const WearHistory history = wearHistoryOf(
      {recorded(100, 0, 0, 10), recorded(101, 1000000, 2500000, 10), recorded(102, 2000000, 5000000, 11),
       recorded(106, 6000000, 15000000, 12), recorded(107, 5, 5, 1), recorded(108, 1000005, 2500005, 2)});
  WearPageSubject subject{"a<b", wearPace(history, 30), 3000};
  const std::string page = wearPage(history, subject);
  EXPECT_EQ(page, wearPage(history, subject));
  EXPECT_EQ(timesIn(page, "a&lt;b"), 1U);
  EXPECT_EQ(timesIn(page, "class=\"mark\""), 3U) << "one in each chart";
  EXPECT_EQ(timesIn(page, ">no record<"), 3U);
  EXPECT_EQ(timesIn(page, ">counters went back<"), 2U);
  // Over four days, of which three are missing, as much a day as on the others.
  EXPECT_EQ(timesIn(page, "<td class=\"n\"><data value=\"4096000000\">4.10 GB</data></td>"), 4U);
  const std::size_t erases = page.find("<path class=\"line first\"", page.find("aria-label=\"Erases"));
  const std::string_view path = std::string_view(page).substr(erases, page.find("/>", erases) - erases);
  EXPECT_EQ(std::ranges::count(path, 'M'), 3);
  EXPECT_EQ(std::ranges::count(path, 'L'), 3);
}

TEST(WearPage, SaysWhenAnEnduranceIsReached) {
  const WearHistory history = wearHistoryOf({recorded(20000, 0, 0, 100), recorded(20010, 0, 0, 110)});
  const auto sentence = [&history](std::optional<std::int64_t> endurance) {
    const std::string page = wearPage(history, {"", wearPace(history, 30), endurance});
    const std::size_t from = page.find("<p class=\"verdict\">") + 19;
    return page.substr(from, page.find('<', from) - from);
  };
  const std::string erased = "The most worn block was erased 110 times until 2024-10-14";
  EXPECT_EQ(sentence(std::nullopt), erased + ", 1 a day over the last 10 days.");
  EXPECT_EQ(sentence(111),
            erased + "; at this pace the 111 times that it is made for are reached on 2024-10-15.");
  EXPECT_EQ(sentence(50), erased + ": the 50 times that it is made for are reached.");
  EXPECT_EQ(timesIn(wearPage({}, {}), "No day was recorded"), 1U);
}

}  // namespace
}  // namespace tbdaily

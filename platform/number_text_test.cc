#include "platform/number_text.h"

#include <gtest/gtest.h>

#include <cmath>

#include "platform/calendar.h"

namespace tbdaily {
namespace {

TEST(RealText, IsShortAndPositionalWherePeopleReadIt) {
  const std::pair<double, const char*> cases[] = {
      {0.0, "0"},           {-0.0, "-0"},
      {10.0, "10"},         {0.1, "0.1"},
      {0.00001, "0.00001"}, {1e-6, "1e-06"},
      {-150.25, "-150.25"}, {1e15, "1000000000000000"},
      {1e16, "1e+16"},      {HUGE_VAL, "inf"},
      {-HUGE_VAL, "-inf"},  {1.7976931348623157e308, "1.7976931348623157e+308"}};
  for (const auto& [value, text] : cases) EXPECT_EQ(realText(value), text);
  EXPECT_EQ(realText(0.1F), "0.1");
  EXPECT_EQ(realText(static_cast<double>(0.1F)), "0.10000000149011612");
}

TEST(DateText, IsUtcWithTheFractionOnlyWhereAsked) {
  const std::pair<double, const char*> cases[] = {{978307200, "2001-01-01T00:00:00Z"},
                                                  {-0.75, "1969-12-31T23:59:59.25Z"},
                                                  {951782400, "2000-02-29T00:00:00Z"},
                                                  {2147483647.0 * 86400, "+5881580-07-11T00:00:00Z"},
                                                  {-2147483648.0 * 86400, "-5877641-06-23T00:00:00Z"}};
  for (const auto& [seconds, text] : cases)
    EXPECT_EQ(dateText(PlistDate::fromUnixSeconds(seconds), DateFraction::Keep), text);
  EXPECT_EQ(dateText(PlistDate{0.5}, DateFraction::Drop), "2001-01-01T00:00:00Z");
}

TEST(StampText, ShowsTheMicrosecondThatTheDoubleMeans) {
  const PlistDate date = PlistDate::fromUnixSeconds(1795597624.123456);
  EXPECT_EQ(stampText(date, 6), "2026-11-25T09:07:04.123456Z");
  EXPECT_EQ(stampText(date, 3), "2026-11-25T09:07:04.123Z");
  EXPECT_EQ(stampText(PlistDate{-1e-9}, 3), "2000-12-31T23:59:59.999Z");
}

}  // namespace
}  // namespace tbdaily

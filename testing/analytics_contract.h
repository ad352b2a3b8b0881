// What callers may rely on in an AnalyticsClient and an AnalyticsHistory, whoever provides them.
//
// AnalyticsHistoryContract: the subject is default-constructible and has `AnalyticsHistory& service()`,
// `void addScalar(std::string_view key, DayNumber day, std::int64_t value)` and
// `void addDistribution(std::string_view key, DayNumber day, std::vector<double> values)`.
// AnalyticsClientContract: `AnalyticsClient& service()`, `void setToday(PlistDate now)` and
// `std::optional<std::int64_t> scalar(std::string_view key, DayNumber day)`.
#pragma once

#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/analytics_client.h"
#include "platform/analytics_history.h"
#include "testing/analytics_lines.h"

namespace tbdaily::testing {

template <typename Subject>
class AnalyticsHistoryContract : public ::testing::Test {
 protected:
  Subject subject;
};
TYPED_TEST_SUITE_P(AnalyticsHistoryContract);

TYPED_TEST_P(AnalyticsHistoryContract, DeliversRowsByKeyInByteOrderAndThenByDay) {
  for (const char* key : {"b", "a.b", "\xC3\xA9", "a", "B"}) {
    this->subject.addScalar(key, 7, 1);
    this->subject.addScalar(key, -3, 2);
    this->subject.addDistribution(key, 7, {1});
    this->subject.addDistribution(key, -3, {2});
  }
  const auto history = this->subject.service().open();
  EXPECT_EQ(scalarLines(*history), (Lines{"B -3 2", "B 7 1", "a -3 2", "a 7 1", "a.b -3 2", "a.b 7 1",
                                          "b -3 2", "b 7 1", "\xC3\xA9 -3 2", "\xC3\xA9 7 1"}));
  EXPECT_EQ(distributionLines(*history),
            (Lines{"B -3: 2", "B 7: 1", "a -3: 2", "a 7: 1", "a.b -3: 2", "a.b 7: 1", "b -3: 2", "b 7: 1",
                   "\xC3\xA9 -3: 2", "\xC3\xA9 7: 1"}));
}

TYPED_TEST_P(AnalyticsHistoryContract, TakesThePrefixLiterallyAndTheDaysInclusively) {
  for (const char* key : {"a%", "a_b", "axb", "a*", "A*", "b"}) {
    for (const DayNumber day : {kFirstDay, 4, 5, 6, kLastDay}) {
      this->subject.addScalar(key, day, 0);
      this->subject.addDistribution(key, day, {0});
    }
  }
  struct Case {
    std::string_view prefix;
    DayNumber minimumDay, maximumDay;
    std::vector<std::string> rows;
  };
  const std::vector<Case> cases{
      {"a", 5, 5, {"a% 5", "a* 5", "a_b 5", "axb 5"}},
      {"a%", 5, 6, {"a% 5", "a% 6"}},
      {"a_", 4, 5, {"a_b 4", "a_b 5"}},
      {"a*", 6, kLastDay, {"a* 6", "a* 2147483647"}},
      {"b", kFirstDay, 4, {"b -2147483648", "b 4"}},
      {"bb", kFirstDay, kLastDay, {}},
      {"b", 6, 5, {}},
      {"\xFF\xFF", kFirstDay, kLastDay, {}},
      {std::string_view("a\0", 2), kFirstDay, kLastDay, {}},
  };
  const auto history = this->subject.service().open();
  for (const Case& c : cases) {
    Lines scalars, distributions;
    for (const std::string& row : c.rows) {
      scalars.push_back(row + " 0");
      distributions.push_back(row + ": 0");
    }
    EXPECT_EQ(scalarLines(*history, c.prefix, c.minimumDay, c.maximumDay), scalars) << c.prefix;
    EXPECT_EQ(distributionLines(*history, c.prefix, c.minimumDay, c.maximumDay), distributions) << c.prefix;
  }
}

TYPED_TEST_P(AnalyticsHistoryContract, YieldsTheValuesOfARowInOrderAndThenNothingMore) {
  this->subject.addDistribution("k", 1, {3, std::nan(""), 1});
  this->subject.addDistribution("k", 1, {2});
  const auto history = this->subject.service().open();
  EXPECT_EQ(distributionLines(*history), Lines{"k 1: 3 nan 1 2"});

  history->enumerateDistributions("", 1, 1,
                                  [](std::string_view, DayNumber, DistributionEnumerator& values, bool&) {
                                    double value = 0;
                                    std::int32_t seconds = 0;
                                    while (values.nextValue(value, seconds)) {
                                    }
                                    value = 42;
                                    seconds = 43;
                                    for (int i = 0; i < 2; ++i)
                                      EXPECT_FALSE(values.nextValue(value, seconds));
                                    EXPECT_EQ(value, 42);
                                    EXPECT_EQ(seconds, 43);
                                  });
}

TYPED_TEST_P(AnalyticsHistoryContract, EndsAtTheStopFlagAndLetsRowsBeDropped) {
  for (const DayNumber day : {1, 2, 3}) {
    this->subject.addScalar("k", day, 0);
    this->subject.addDistribution("k", day, {1, 2});
  }
  const auto history = this->subject.service().open();
  std::vector<DayNumber> days;
  history->enumerateScalars("", 1, 3, [&](std::string_view, DayNumber day, std::int64_t, bool& stop) {
    days.push_back(day);
    stop = day == 2;
  });
  EXPECT_EQ(days, (std::vector<DayNumber>{1, 2}));
  days.clear();
  history->enumerateDistributions(
      "", 1, 3, [&](std::string_view, DayNumber day, DistributionEnumerator& values, bool& stop) {
        days.push_back(day);
        stop = day == 2;
        double value = 0;
        std::int32_t seconds = 0;
        if (stop) {
          EXPECT_TRUE(values.nextValue(value, seconds) && value == 1);
        }
      });
  EXPECT_EQ(days, (std::vector<DayNumber>{1, 2}));
  EXPECT_EQ(distributionLines(*history, "k", 3, 3), Lines{"k 3: 1 2"});
}

TYPED_TEST_P(AnalyticsHistoryContract, ShowsTheStateAtItsOpening) {
  EXPECT_EQ(scalarLines(*this->subject.service().open()), Lines{});
  this->subject.addScalar("k", 1, 1);
  const auto history = this->subject.service().open();
  this->subject.addScalar("k", 1, 2);
  this->subject.addDistribution("k", 1, {5});
  EXPECT_EQ(scalarLines(*history), Lines{"k 1 1"});
  EXPECT_EQ(distributionLines(*history), Lines{});
  EXPECT_EQ(distributionLines(*this->subject.service().open()), Lines{"k 1: 5"});
}

REGISTER_TYPED_TEST_SUITE_P(AnalyticsHistoryContract, DeliversRowsByKeyInByteOrderAndThenByDay,
                            TakesThePrefixLiterallyAndTheDaysInclusively,
                            YieldsTheValuesOfARowInOrderAndThenNothingMore,
                            EndsAtTheStopFlagAndLetsRowsBeDropped, ShowsTheStateAtItsOpening);

template <typename Subject>
class AnalyticsClientContract : public ::testing::Test {
 protected:
  Subject subject;
};
TYPED_TEST_SUITE_P(AnalyticsClientContract);

TYPED_TEST_P(AnalyticsClientContract, NumbersUtcDaysSince1970) {
  AnalyticsClient& client = this->subject.service();
  struct Case {
    double unixSeconds;
    DayNumber day;
  };
  for (const Case c : {Case{0, 0}, Case{-1, -1}, Case{86399, 0}, Case{86400, 1}, Case{1e300, kLastDay}}) {
    EXPECT_EQ(client.dayNumberOfDate(PlistDate::fromUnixSeconds(c.unixSeconds)), c.day) << c.unixSeconds;
  }
  EXPECT_EQ(client.dateOfDayNumber(-2).unixSeconds(), -172800);
  this->subject.setToday(PlistDate::fromUnixSeconds(86400.0 * 20000 + 5));
  EXPECT_EQ(client.currentDayNumber(), 20000);
}

TYPED_TEST_P(AnalyticsClientContract, SetsReplaceAndAddsSumTodaysValueAndWrap) {
  AnalyticsClient& client = this->subject.service();
  this->subject.setToday(dateOf(10));
  client.addValueForScalarKey("k", 5);
  client.addValueForScalarKey("k", -7);
  client.setValueForScalarKey("other", 3);
  client.setValueForScalarKey("other", 4);
  this->subject.setToday(dateOf(11));
  client.setValueForScalarKey("k", std::numeric_limits<std::int64_t>::max());
  client.addValueForScalarKey("k", 2);
  client.checkpoint();
  EXPECT_EQ(this->subject.scalar("k", 10), -2);
  EXPECT_EQ(this->subject.scalar("other", 10), 4);
  EXPECT_EQ(this->subject.scalar("k", 11), std::numeric_limits<std::int64_t>::min() + 1);
  EXPECT_EQ(this->subject.scalar("other", 11), std::nullopt);
}

REGISTER_TYPED_TEST_SUITE_P(AnalyticsClientContract, NumbersUtcDaysSince1970,
                            SetsReplaceAndAddsSumTodaysValueAndWrap);

}  // namespace tbdaily::testing

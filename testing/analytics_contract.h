// What callers may rely on in an AnalyticsHistory and an AnalyticsClient, whoever provides them. The subject
// of both is that of ContractTest. That of the history has `addScalar(key, day, value)` and
// `addDistribution(key, day, values)`, which appends.
#pragma once

#include "testing/analytics_lines.h"
#include "testing/contract_test.h"

namespace tbdaily::testing {

template <typename Subject>
struct AnalyticsContract : ContractTest<Subject> {
  AnalyticsHistory& history = this->services.analyticsHistory;
};
TYPED_TEST_SUITE_P(AnalyticsContract);

TYPED_TEST_P(AnalyticsContract, RowsComeByKeyInByteOrderWithALiteralPrefixAndInclusiveDays) {
  for (const char* key : {"b", "\xC3\xA9", "a%", "a_b", "axb", "a*", "A*"}) {
    for (const DayNumber day : {6, kFirstDay, 4, 5, kLastDay}) {
      this->subject.addScalar(key, day, 0);
      this->subject.addDistribution(key, day, {0});
    }
  }
  struct Case {
    std::string_view prefix;
    DayNumber minimumDay, maximumDay;
    Lines rows;
  };
  const std::vector<Case> cases{
      {"", 5, 5, {"A* 5", "a% 5", "a* 5", "a_b 5", "axb 5", "b 5", "\xC3\xA9 5"}},
      {"a%", 5, 6, {"a% 5", "a% 6"}},
      {"a_", 4, 5, {"a_b 4", "a_b 5"}},
      {"a*", 6, kLastDay, {"a* 6", "a* 2147483647"}},
      {"b", kFirstDay, 4, {"b -2147483648", "b 4"}},
      {"bb", kFirstDay, kLastDay, {}},
      {"b", 6, 5, {}},
      {"\xFF\xFF", kFirstDay, kLastDay, {}},
      {std::string_view("a\0", 2), kFirstDay, kLastDay, {}},
  };
  const auto opened = this->history.open();
  for (const Case& c : cases) {
    Lines scalars, distributions;
    for (const std::string& row : c.rows) {
      scalars.push_back(row + " 0");
      distributions.push_back(row + ": 0");
    }
    EXPECT_EQ(scalarLines(*opened, c.prefix, c.minimumDay, c.maximumDay), scalars) << c.prefix;
    EXPECT_EQ(distributionLines(*opened, c.prefix, c.minimumDay, c.maximumDay), distributions) << c.prefix;
  }
}

TYPED_TEST_P(AnalyticsContract, ARowYieldsItsValuesInOrderAndThenNothingMore) {
  this->subject.addDistribution("k", 1, {3, std::nan(""), 1});
  this->subject.addDistribution("k", 1, {2});
  const auto opened = this->history.open();
  for (const std::size_t beforeVisit : {0U, 1U, 3U, 4U, 5U})
    EXPECT_EQ(distributionLines(*opened, "", 1, 1, beforeVisit), Lines{"k 1: 3 nan 1 2"});
  opened->enumerateDistributions("", 1, 1,
                                 [](std::string_view, DayNumber, DistributionEnumerator& values, bool&) {
                                   double value = 0;
                                   std::int32_t seconds = 0;
                                   while (values.nextValue(value, seconds)) {
                                   }
                                   value = 42;
                                   seconds = 43;
                                   EXPECT_FALSE(values.nextValue(value, seconds));
                                   EXPECT_TRUE(value == 42 && seconds == 43);
                                 });
}

TYPED_TEST_P(AnalyticsContract, EnumerationsEndAtTheStopFlagAndRowsCanBeDropped) {
  for (const DayNumber day : {1, 2, 3}) {
    this->subject.addScalar("k", day, 0);
    this->subject.addDistribution("k", day, {1, 2});
  }
  const auto opened = this->history.open();
  std::vector<DayNumber> days;
  opened->enumerateScalars("", 1, 3, [&](std::string_view, DayNumber day, std::int64_t, bool& stop) {
    days.push_back(day);
    stop = day == 2;
  });
  opened->enumerateDistributions(
      "", 1, 3, [&](std::string_view, DayNumber day, DistributionEnumerator& values, bool& stop) {
        days.push_back(day);
        stop = day == 2;
        double value = 0;
        std::int32_t seconds = 0;
        EXPECT_TRUE(!stop || (values.nextValue(value, seconds) && value == 1));
      });
  EXPECT_EQ(days, (std::vector<DayNumber>{1, 2, 1, 2}));
  EXPECT_EQ(distributionLines(*opened, "k", 3, 3), Lines{"k 3: 1 2"});
}

TYPED_TEST_P(AnalyticsContract, AnOpenHistoryShowsTheStateAtItsOpening) {
  EXPECT_EQ(scalarLines(*this->history.open()), Lines{});
  this->subject.addScalar("k", 1, 1);
  const auto opened = this->history.open();
  this->subject.addScalar("k", 1, 2);
  this->subject.addDistribution("k", 1, {5});
  EXPECT_EQ(scalarLines(*opened), Lines{"k 1 1"});
  EXPECT_EQ(distributionLines(*opened), Lines{});
  EXPECT_EQ(distributionLines(*this->history.open()), Lines{"k 1: 5"});
}

REGISTER_TYPED_TEST_SUITE_P(AnalyticsContract, RowsComeByKeyInByteOrderWithALiteralPrefixAndInclusiveDays,
                            ARowYieldsItsValuesInOrderAndThenNothingMore,
                            EnumerationsEndAtTheStopFlagAndRowsCanBeDropped,
                            AnOpenHistoryShowsTheStateAtItsOpening);

// Of a client whose rows the history of the same platform shows, which those of the fakes are not. The
// subject has `setToday(PlistDate)`.
template <typename Subject>
struct AnalyticsClientContract : ContractTest<Subject> {};
TYPED_TEST_SUITE_P(AnalyticsClientContract);
GTEST_ALLOW_UNINSTANTIATED_PARAMETERIZED_TEST(AnalyticsClientContract);

TYPED_TEST_P(AnalyticsClientContract, WritesScalarsOfTheUtcDay) {
  AnalyticsClient& client = this->services.analyticsClient;
  for (const auto& [unixSeconds, day] :
       {std::pair(0.0, 0), {-1, -1}, {86399, 0}, {86400, 1}, {1e300, kLastDay}})
    EXPECT_EQ(client.dayNumberOfDate(PlistDate::fromUnixSeconds(unixSeconds)), day) << unixSeconds;
  EXPECT_EQ(client.dateOfDayNumber(-2).unixSeconds(), -172800);

  this->subject.setToday(dateOf(10));
  client.addValueForScalarKey("k", 5);
  client.addValueForScalarKey("k", -7);
  client.setValueForScalarKey("other", 3);
  client.setValueForScalarKey("other", 4);
  this->subject.setToday(PlistDate::fromUnixSeconds(86400.0 * 11 + 5));
  EXPECT_EQ(client.currentDayNumber(), 11);
  client.setValueForScalarKey("k", std::numeric_limits<std::int64_t>::max());
  client.addValueForScalarKey("k", 2);
  client.checkpoint();
  EXPECT_EQ(scalarLines(*this->services.analyticsHistory.open()),
            (Lines{"k 10 -2", "k 11 -9223372036854775807", "other 10 4"}));
}

REGISTER_TYPED_TEST_SUITE_P(AnalyticsClientContract, WritesScalarsOfTheUtcDay);

}  // namespace tbdaily::testing

#include "tools/tallyctl/wear/wear_history.h"

#include <gtest/gtest.h>

#include <limits>

#include "tools/tallyctl/wear/wear_history_test_support.h"

namespace tbdaily {
namespace {

using testing::recorded;

TEST(WearHistory, EachDayIsComparedWithTheOneBeforeIt) {
  WearDay partial;
  partial.day = 107;
  partial.hottestCycle = 12;
  const WearHistory history = wearHistoryOf({recorded(100, 1000, 3000, 10), recorded(101, 1100, 3250, 10),
                                             recorded(105, 1100, 3250, 11), partial, recorded(108, 5, 5, 1)});
  EXPECT_EQ(history.days[0].writeAmplification, std::nullopt);
  EXPECT_EQ(history.days[1].writeAmplification, 2.5);
  EXPECT_EQ(history.days[1].daysMissing, 0);
  EXPECT_EQ(history.days[2].daysMissing, 3);
  EXPECT_EQ(history.days[2].writeAmplification, std::nullopt) << "the host wrote nothing";
  EXPECT_EQ(history.days[3].hostWritten, std::nullopt);
  EXPECT_FALSE(history.days[3].wentBack);
  EXPECT_TRUE(history.days[4].wentBack);
  EXPECT_EQ(history.days[4].writeAmplification, std::nullopt);
}

TEST(WearHistory, AGrowthThatDoesNotFitIsNone) {
  constexpr std::int64_t kLeast = std::numeric_limits<std::int64_t>::min();
  const WearHistory history = wearHistoryOf({recorded(1, kLeast, 0, 0), recorded(2, 1, 1, 0)});
  EXPECT_EQ(history.days[1].hostWritten, std::nullopt);
  EXPECT_FALSE(history.days[1].wentBack);
}

TEST(WearPace, IsThatOfTheLastDaysSinceACounterWentBack) {
  WearHistory history = wearHistoryOf({recorded(10, 0, 0, 500), recorded(20, 0, 0, 100),
                                       recorded(60, 400, 800, 140), recorded(70, 500, 1000, 150)});
  auto pace = wearPace(history, 30);
  ASSERT_TRUE(pace);
  EXPECT_EQ(pace->days, 10);
  EXPECT_EQ(pace->cyclesPerDay, 1);
  EXPECT_EQ(pace->hostPerDay, 10);
  EXPECT_EQ(pace->dayOfCycles(250), 170);
  EXPECT_EQ(pace->dayOfCycles(150), 70);
  EXPECT_EQ(pace->dayOfCycles(std::numeric_limits<std::int64_t>::max()), std::nullopt);
  pace = wearPace(history, 1000);
  ASSERT_TRUE(pace);
  EXPECT_EQ(pace->days, 50) << "not across the day on which the counters went back";
  history.days.resize(1);
  EXPECT_EQ(wearPace(history, 30), std::nullopt);
}

TEST(WearPace, AStandstillMeetsNothing) {
  const auto pace = wearPace(wearHistoryOf({recorded(1, 0, 0, 5), recorded(9, 0, 0, 5)}), 30);
  ASSERT_TRUE(pace);
  EXPECT_EQ(pace->dayOfCycles(6), std::nullopt);
}

}  // namespace
}  // namespace tbdaily

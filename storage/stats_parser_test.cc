#include <gmock/gmock.h>

#include "storage/stats_context.h"
#include "storage/stats_table.h"
#include "storage/storage_test_support.h"

namespace tbdaily {
namespace {

using testing::StatsBuffer;

std::string listOf(const StatsContext& context) {
  std::string list;
  for (const StatNode& node : context.nodes) list += node.name() + "=" + node.text() + " ";
  return list;
}

// Count and checksum were taken from the controller's list of statistics, "id:name:limit\n" a row, by a
// script that does not read the table.
TEST(StatsTable, HoldsEveryStatistic) {
  std::string rows;
  for (std::uint32_t id = 0; id < 1000; ++id) {
    if (const auto row = findStat(id))
      rows += std::to_string(id) + ":" + std::string(kStats[*row].name) + ":" +
              std::to_string(kStats[*row].limit) + "\n";
  }
  EXPECT_EQ(std::ranges::count(rows, '\n'), 356);
  EXPECT_EQ(testing::checksum(rows), 0xe9f986060ad97ce0);
}

TEST(StatsParser, ListsValuesUnderTheirNames) {
  const std::vector<std::pair<StatsBuffer, std::string>> cases = {
      {StatsBuffer().record(53, {0x20002}), "exportVersion=131074 "},
      {StatsBuffer().record(184, {}).record(1, {7}), "version=7 "},
      {StatsBuffer().record(184, {3, 4}).record(4, {}), "TempSensorMax=3 "},
      {StatsBuffer().record(124, {9}), "coldestCycle=9 "},
      {StatsBuffer().record(124, {9, 8, 7}), "coldestCycle0=9 coldestCycle1=8 "},
      {StatsBuffer().record(21, {1, 2}).record(0x30000000, {1}).record(2, {~0ULL}),
       "hostWriteXacts=18446744073709551615 "},
  };
  for (const auto& [buffer, list] : cases) {
    StatsContext context;
    EXPECT_TRUE(STXParseBufferToCxt(context, buffer.bytes));
    EXPECT_EQ(listOf(context), list);
  }
}

TEST(StatsParser, SkipsValuesBeyondTheLimitAndReleasesAll) {
  const StatsBuffer buffer = StatsBuffer().record(327, std::vector<std::uint64_t>(30, 5)).record(7, {6});
  StatsContext context;
  EXPECT_TRUE(STXParseBufferToCxt(context, buffer.bytes));
  ASSERT_EQ(context.nodes.size(), 23U);
  const StatNode last = *std::ranges::next(context.nodes.begin(), 21);
  EXPECT_TRUE(last.isNamed("bandsMaxTempHisto21"));
  EXPECT_FALSE(last.isNamed("bandsMaxTempHisto2"));
  STXReleaseContext(context);
  EXPECT_EQ(context.driverVersion + context.hostReads + context.nodes.size(), 0U);
  EXPECT_EQ(listOf(context), "");
}

TEST(StatsParser, RefusesWhatDoesNotAddUp) {
  const StatsBuffer good = StatsBuffer().record(53, {0x20002}).record(113, {1, 2, 3, 4});
  for (std::size_t length = 0; length <= good.bytes.size(); ++length) {
    StatsContext context;
    const std::size_t words = length / 8;
    const bool endsWithARecord = words == 2 || words == 7;
    EXPECT_EQ(STXParseBufferToCxt(context, std::span(good.bytes).first(length)), endsWithARecord) << length;
    EXPECT_EQ(context.driverVersion, 0xFFFFFFFF);
    EXPECT_EQ(context.exportVersion, endsWithARecord ? 0x20002U : 0U) << length;
    EXPECT_EQ(context.nodes.size(), words < 2 ? 0U : words < 7 ? 1U : 5U);
  }
  for (const std::uint64_t header : {0x1'0000'0001ULL, 0x3000'0001ULL, ~0ULL, 0xFFFFFFFF'00000035ULL}) {
    const StatsBuffer buffer = StatsBuffer().record(53, {3}).word(header);
    StatsContext context;
    EXPECT_FALSE(STXParseBufferToCxt(context, buffer.bytes));
    EXPECT_EQ(context.exportVersion, 0U);
    EXPECT_EQ(listOf(context), "exportVersion=3 ");
  }
}

}  // namespace
}  // namespace tbdaily

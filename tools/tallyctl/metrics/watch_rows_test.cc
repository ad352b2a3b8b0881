#include "tools/tallyctl/metrics/watch_rows.h"

#include <gmock/gmock.h>

namespace tbdaily::testing {
namespace {

using namespace kdreport;
using ::testing::ElementsAre;

ChannelValues simple(std::int64_t id, const std::string& name, std::int64_t value) {
  ChannelValues channel;
  channel.driver = "disk";
  channel.driverID = 19;
  channel.group = "totals";
  channel.channelID = id;
  channel.name = name;
  channel.format = kKdReportSimple;
  channel.unit = 0x0900820000000000;
  channel.unitLabel = "B";
  channel.value = value;
  return channel;
}

ChannelValues states(std::int64_t idle, std::int64_t user) {
  ChannelValues channel = simple(7, "cpu0.time", 0);
  channel.format = kKdReportState;
  channel.subGroup = "cpu0";
  channel.states = {{1, "idle", 0, idle, 0.9}, {2, "user", 0, user, 0.1}, {3, "nice", 0, 0, 0}};
  return channel;
}

std::vector<std::string> texts(const std::vector<WatchRow>& rows) {
  std::vector<std::string> texts;
  for (const WatchRow& row : rows)
    texts.push_back((row.isHeading ? "# " : "") + row.name + "|" + row.figure + "|" + row.human + "|" +
                    row.rate + "|" + row.shares);
  return texts;
}

TEST(WatchRowsTest, RatesAndSharesAreThoseSinceTheEarlierSample) {
  const std::vector<ChannelValues> now{simple(1, "readBytes", 5'000), simple(2, "late", 7),
                                       states(4'000, 6'000)};
  EXPECT_THAT(texts(watchRows(now, {}, "")),
              ElementsAre("# disk / totals||||", "readBytes|5000 B|5.00 kB||", "late|7 B|||",
                          "# disk / totals / cpu0||||", "cpu0.time||||idle 90.0%  user 10.0%"));
  // Another order, a channel that is new, one that is gone.
  const EarlierSample earlier{{states(1'000, 0), simple(9, "gone", 1), simple(1, "readBytes", 1'000)}, 2};
  EXPECT_THAT(texts(watchRows(now, earlier, "")),
              ElementsAre("# disk / totals||||", "readBytes|5000 B|5.00 kB|2.00 kB/s|", "late|7 B|||",
                          "# disk / totals / cpu0||||", "cpu0.time||||user 66.7%  idle 33.3%"));
}

TEST(WatchRowsTest, AFilterTakesWholeNamesInWhateverCase) {
  const std::vector<ChannelValues> now{simple(1, "readBytes", 1),
                                       simple(2, "writtenBytes", kKdReportInvalid)};
  EXPECT_THAT(texts(watchRows(now, {}, "TOTALS/W")),
              ElementsAre("# disk / totals||||", "writtenBytes|- B|||"));
  EXPECT_TRUE(watchRows(now, {}, "moon").empty());
}

}  // namespace
}  // namespace tbdaily::testing

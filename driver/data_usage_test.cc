#include "driver/data_usage.h"

#include <gmock/gmock.h>

#include "testing/fake_platform.h"
#include "testing/json_test_support.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;

constexpr DayNumber kToday = 20781;
const PlistDate kMorning = PlistDate::fromUnixSeconds(kToday * 86400.0 + 0.125);
constexpr const char* kOwn = "com.velmora.sysmetrics.tbdaily";

PlistValue record(const char* nameKey, const char* name, PlistDate since,
                  std::vector<std::int64_t> counters) {
  PlistDictionary entries{{nameKey, PlistValue::string(name)}, {"since", PlistValue(since)}};
  for (std::size_t i = 0; i < counters.size(); ++i)
    entries.set(kTrafficFields[i], PlistValue::int64(counters[i]));
  return PlistValue::dictionary(std::move(entries));
}

struct DataUsageTest : ::testing::Test {
  DataUsageTest() { fake_.analyticsClient.today = kToday; }
  // The increments of one run.
  std::vector<std::string> run(PlistArray records) {
    fake_.usageService.records = PlistValue::array(std::move(records));
    fake_.analyticsClient.calls.clear();
    CollectDataUsage(fake_.platform);
    fake_.usageService.waitForReplies();
    return fake_.analyticsClient.calls;
  }
  PlistValue baseline() { return fake_.preferences.getValue(kUsageBaselineKey, kOwn); }

  testing::FakePlatform fake_;
};

TEST_F(DataUsageTest, FirstRunsCountWhatBeganSinceYesterdayAndLaterOnesTheDifference) {
  const PlistDate old = dateOf(kToday - 2), restarted{kMorning.secondsSinceReference + 0.5};
  EXPECT_THAT(run({record("bundleName", "b", kMorning, {1024, 1023, -2048}),
                   record("procName", "p", old, {5000, 5000, 5000, 5000}),
                   record("procName", "y", dateOf(kToday - 1), {2048})}),
              ElementsAre("add datausage.wifiInKB.b 1", "add datausage.wwanInKB.b -2",
                          "add datausage.olddata.com.velmora.p 1", "add datausage.wifiInKB.com.velmora.y 2"));
  EXPECT_EQ(fake_.preferences.writes.back(), std::string("synchronize ") + kOwn);

  using Limits = std::numeric_limits<std::int64_t>;
  const std::tuple<PlistDate, std::vector<std::int64_t>, std::vector<std::string>> runs[] = {
      {kMorning,
       {6024, 100, 0, 1023},
       {"add datausage.wifiInKB.b 4", "add datausage.baddata.b 1", "add datausage.wwanInKB.b 2"}},
      {restarted, {4096, 0, 0, 0}, {"add datausage.wifiInKB.b 4"}},
      // The difference wraps at 64 bits.
      {restarted, {Limits::min()}, {"add datausage.wifiInKB.b 9007199254740988"}},
      {restarted, {Limits::max()}, {"add datausage.baddata.b 1"}}};
  for (const auto& [since, counters, calls] : runs)
    EXPECT_EQ(run({record("bundleName", "b", since, counters)}), calls);
  EXPECT_EQ(baseline().asDictionary()->size(), 1U);  // who is not in the reply is forgotten

  // What could not be stored is counted by the next run.
  fake_.analyticsClient.roomForLoads = 0;
  const PlistDate later{restarted.secondsSinceReference + 1};
  PlistArray reply{record("bundleName", "b", later, {4096})};
  run(reply);
  fake_.analyticsClient.roomForLoads = 1;
  EXPECT_THAT(run(reply), ElementsAre("add datausage.wifiInKB.b 4"));
  // However long a reply is, it is stored whole or not at all.
  for (int i = 0; i < 10000; ++i)
    reply.push_back(record("bundleName", std::to_string(i).c_str(), later, {1024}));
  fake_.analyticsClient.roomForLoads = 1;
  EXPECT_EQ(run(reply).size(), 10000U);
  EXPECT_THAT(run(reply), ElementsAre());
}

TEST_F(DataUsageTest, WhatIsNotAsItShouldBeIsSkipped) {
  PlistDictionary odd = testing::dictionaryOf(
      R"({"bundleName": 5, "procName": "p", "wifiInBytes": "x", "wwanOutBytes": 2048.9})");
  odd.set("since", PlistValue(kMorning));
  fake_.preferences.domains[kOwn].set(kUsageBaselineKey, testing::plistOf(R"({"p": []})"));
  EXPECT_THAT(
      run({PlistValue::string("no record"), PlistValue::dictionary(odd),
           record("other", "n", kMorning, {4096}), testing::plistOf(R"({"procName": "no since"})"),
           record("procName", "bad\x01name", kMorning, {4096}), record("bundleName", "b", kMorning, {1024})}),
      ElementsAre("add datausage.wwanOutKB.com.velmora.p 2", "add datausage.wifiInKB.b 1"));
}

TEST_F(DataUsageTest, AReplyAfterTheWaitIsProcessedAllTheSame) {
  fake_.usageService.isLate = true;
  fake_.usageService.records = PlistValue::array({record("bundleName", "b", kMorning, {4096})});
  CollectDataUsage(fake_.platform, std::chrono::milliseconds(20));
  EXPECT_TRUE(fake_.systemLog.has("default: Netwatch timed out, no datausage available"));
  fake_.usageService.waitForReplies();
  EXPECT_THAT(fake_.analyticsClient.calls, ElementsAre("add datausage.wifiInKB.b 4"));
}

}  // namespace
}  // namespace tbdaily

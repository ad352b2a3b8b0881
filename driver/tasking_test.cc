#include "driver/tasking.h"

#include <gmock/gmock.h>

#include "platform/plist_text.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

const std::string kJob = "com.velmora.tallyd.tbdaily";
constexpr DayNumber kToday = 20781;

PlistValue text(const char* t) {
  return PlistValue::string(t);
}
PlistValue item(const char* domain, const char* key, const PlistValue& value) {
  return PlistValue::dictionary({{"Domain", text(domain)}, {"Key", text(key)}, {"Value", value}});
}

class TaskingTest : public ::testing::Test {
 protected:
  TaskingTest() {
    fake_.analyticsClient.today = kToday;
    fake_.deviceAnswers.build = "A1";
  }
  void schedule(const char* id, PlistValue payload) {
    PlistDictionary tasking{{"TaskingID", text(id)}, {"TaskingDigest", PlistValue::int64(7)}};
    tasking.set("TaskingPayload", std::move(payload));
    fake_.preferences.setValue("ScheduledTasking", PlistValue::dictionary(tasking), "com.velmora.Crashferry");
  }
  // What a run writes, posts and logs.
  std::vector<std::string> run() {
    fake_.preferences.writes.clear();
    fake_.systemLog.lines.clear();
    fake_.notifications.posts.clear();
    HandleTaskingAndOSChange(fake_.platform);
    return fake_.preferences.writes;
  }
  PlistValue job(const char* key) { return fake_.preferences.getValue(key, kJob); }

  testing::FakePlatform fake_;
};

TEST_F(TaskingTest, AppliesWithdrawsAndAppliesAgainInOrder) {
  schedule("t1", PlistValue::array(
                     {item("b", "x", PlistValue::int64(1)), text("malformed"), item("a", "y", text("v"))}));
  EXPECT_THAT(run(), ElementsAre("set " + kJob + "/LastOSUpdate", "set b/x", "set a/y",
                                 "set " + kJob + "/TaskingID", "set " + kJob + "/TaskingOS",
                                 "set " + kJob + "/TaskingDigest", "set " + kJob + "/TaskingPayload",
                                 "synchronize a", "synchronize b", "synchronize " + kJob));
  EXPECT_THAT(fake_.notifications.posts, ElementsAre("com.velmora.da.tasking_changed"));
  EXPECT_THAT(fake_.systemLog.lines, ElementsAre("default: OS change since last run ((null) -> A1)"));
  EXPECT_EQ(plistText(job("LastOSUpdate")), R"({"version": "A1", "day": 20781})");
  EXPECT_EQ(job("TaskingDigest").asInteger(), 7);
  EXPECT_THAT(run(), IsEmpty());
  EXPECT_THAT(fake_.notifications.posts, IsEmpty());

  fake_.deviceAnswers.build = "A2";
  EXPECT_EQ(run().size(), 15U);
  EXPECT_THAT(fake_.systemLog.lines, ElementsAre("default: OS change since last run (A1 -> A2)",
                                                 "default: Tasking update (t1 -> t1, A1 -> A2)"));
  EXPECT_EQ(job("TaskingOS").asString(), "A2");
  EXPECT_EQ(fake_.preferences.getValue("x", "b").asInteger(), 1);

  schedule("t2", {});  // no payload: withdrawn, nothing new, and announced every time
  run();
  EXPECT_TRUE(fake_.preferences.getValue("x", "b").isNone());
  EXPECT_TRUE(job("TaskingID").isNone() && job("TaskingPayload").isNone());
  EXPECT_EQ(job("TaskingOS").asString(), "A2");
  EXPECT_THAT(run(), IsEmpty());
  EXPECT_THAT(fake_.notifications.posts, ElementsAre("com.velmora.da.tasking_changed"));
}

TEST_F(TaskingTest, SubmitsOnTheFirstDaysAfterAnUpdate) {
  schedule("t1", PlistValue::array({}));
  fake_.logSubmission.taskingValues.set("AggressiveSubmissionDays", text(" 3 days"));
  for (const DayNumber day : {kToday, kToday + 3, kToday - 2}) {
    fake_.analyticsClient.today = day;
    run();
  }
  EXPECT_THAT(fake_.logSubmission.calls, ElementsAre("submit", "submit"));
  EXPECT_TRUE(fake_.systemLog.has("default: Aggressive submission day 2 of 3; triggering log submission"));
}

TEST(AggressiveDays, ReadsNumbersAndDecimalTexts) {
  EXPECT_EQ(aggressiveDays({}), 0);
  EXPECT_EQ(aggressiveDays(PlistValue::float64(2.9)), 2);
  EXPECT_EQ(aggressiveDays(PlistValue::boolean(true)), 0);
  EXPECT_EQ(aggressiveDays(PlistValue::int64(1LL << 40)), 2147483647);
  for (const auto& [given, days] :
       {std::pair{"+7", 7}, {"-2", -2}, {"x", 0}, {"", 0}, {"99999999999999999999", 2147483647}}) {
    EXPECT_EQ(aggressiveDays(text(given)), days) << given;
  }
}

}  // namespace
}  // namespace tbdaily

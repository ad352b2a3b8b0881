#include "driver/tasking.h"

#include <gmock/gmock.h>

#include "platform/plist_text.h"
#include "testing/fake_platform.h"
#include "testing/json_test_support.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

const std::string kJob = "com.velmora.tallyd.tbdaily";
constexpr DayNumber kToday = 20781;

struct TaskingTest : ::testing::Test {
  TaskingTest() {
    fake_.analyticsClient.today = kToday;
    fake_.deviceAnswers.build = "A1";
  }
  void schedule(std::string_view tasking) {
    fake_.preferences.setValue("ScheduledTasking", testing::plistOf(tasking), "com.velmora.Crashferry");
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
  schedule(R"({"TaskingID": "t1", "TaskingDigest": 7, "TaskingPayload": [
      {"Domain": "b", "Key": "x", "Value": 1}, "malformed", {"Domain": "a", "Key": "y", "Value": "v"}]})");
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

  schedule(R"({"TaskingID": "t2"})");  // no payload: withdrawn, nothing new, and announced every time
  run();
  EXPECT_TRUE(fake_.preferences.getValue("x", "b").isNone());
  EXPECT_TRUE(job("TaskingID").isNone() && job("TaskingPayload").isNone());
  EXPECT_EQ(job("TaskingOS").asString(), "A2");
  EXPECT_THAT(run(), IsEmpty());
  EXPECT_THAT(fake_.notifications.posts, ElementsAre("com.velmora.da.tasking_changed"));
}

TEST_F(TaskingTest, WhatADomainDoesNotTakeIsMadeUpByTheNextRun) {
  const auto scheduleNumber = [&](const char* id, const char* value) {
    schedule(std::string(R"({"TaskingID": ")") + id +
             R"(", "TaskingPayload": [{"Domain": "a", "Key": "y", "Value": )" + value +
             R"(}, {"Domain": "b", "Key": "x", "Value": )" + value + "}]}");
  };
  const auto setting = [&](const char* domain, const char* key) {
    return fake_.preferences.getValue(key, domain).asInteger();
  };
  fake_.preferences.unwritable = "b";
  scheduleNumber("t1", "1");
  run();
  EXPECT_EQ(job("TaskingID").asString(), "t1");
  EXPECT_EQ(plistText(job("TaskingUnwritten")), R"([{"Domain": "b", "Key": "x", "Value": 1}])");
  EXPECT_EQ(setting("a", "y"), 1);
  scheduleNumber("t2", "2");  // the last word on a setting is the one that waits
  run();
  EXPECT_EQ(job("TaskingID").asString(), "t2");
  EXPECT_EQ(plistText(job("TaskingUnwritten")), R"([{"Domain": "b", "Key": "x", "Value": 2}])");
  EXPECT_EQ(setting("a", "y"), 2);

  fake_.preferences.unwritable.reset();
  run();
  EXPECT_EQ(setting("b", "x"), 2);
  EXPECT_TRUE(job("TaskingUnwritten").isNone());

  fake_.preferences.unwritable = "b";  // a setting that could not be withdrawn
  schedule(R"({"TaskingID": "t3"})");
  run();
  EXPECT_EQ(setting("b", "x"), 2);
  fake_.preferences.unwritable.reset();
  run();
  EXPECT_TRUE(fake_.preferences.getValue("x", "b").isNone());
}

TEST_F(TaskingTest, NeitherGivesNorTakesConsentAndWithdrawsWhatNoTextNames) {
  fake_.preferences.setValue("DiagnosticLogSubmissionEnabled", PlistValue::boolean(false),
                             "com.velmora.Crashferry");
  schedule(R"({"TaskingID": "t1", "TaskingPayload": [
      {"Domain": "com.velmora.Crashferry", "Key": "DiagnosticLogSubmissionEnabled", "Value": true},
      {"Domain": "b", "Key": "x", "Value": 1}]})");
  run();
  const auto consent = [&] {
    return fake_.preferences.getValue("DiagnosticLogSubmissionEnabled", "com.velmora.Crashferry");
  };
  EXPECT_EQ(consent().asBoolean(), false);
  EXPECT_EQ(fake_.preferences.getValue("x", "b").asInteger(), 1);
  EXPECT_EQ(fake_.diagnostics.errors,
            "tbdaily: a tasking cannot say whether logs may leave this device: that item is left out\n");
  fake_.preferences.setValue("TaskingID", PlistValue::int64(1), kJob);  // somebody's, and no text
  schedule(R"({"TaskingID": "t2", "TaskingPayload": []})");
  run();
  EXPECT_EQ(consent().asBoolean(), false);
  EXPECT_TRUE(fake_.preferences.getValue("x", "b").isNone());
}

TEST_F(TaskingTest, SubmitsOnTheFirstDaysAfterAnUpdate) {
  schedule(R"({"TaskingID": "t1", "TaskingPayload": []})");
  fake_.logSubmission.taskingValues.set("AggressiveSubmissionDays", PlistValue::string(" 3 days"));
  for (const DayNumber day : {kToday, kToday + 3, kToday - 2}) {
    fake_.analyticsClient.today = day;
    run();
  }
  EXPECT_THAT(fake_.logSubmission.calls, ElementsAre("submit", "submit"));
  EXPECT_TRUE(fake_.systemLog.has("default: Aggressive submission day 2 of 3; triggering log submission"));
}

TEST(AggressiveDays, ReadsNumbersAndDecimalTexts) {
  EXPECT_EQ(aggressiveDays({}), 0);
  for (const auto& [given, days] : {std::pair{"2.9", 2},
                                    {"true", 0},
                                    {"1099511627776", 2147483647},
                                    {R"("+7")", 7},
                                    {R"("-2")", -2},
                                    {R"("x")", 0},
                                    {R"("")", 0},
                                    {R"("99999999999999999999")", 2147483647}})
    EXPECT_EQ(aggressiveDays(testing::plistOf(given)), days) << given;
}

}  // namespace
}  // namespace tbdaily

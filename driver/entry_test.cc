#include "driver/entry.h"

#include <gmock/gmock.h>

#include "driver/daily_tasks.h"
#include "driver/environment_probes.h"
#include "driver/service_endpoint.h"
#include "platform/plist_text.h"
#include "report/internal_device.h"
#include "report/tb_config.h"
#include "testing/fake_platform.h"
#include "testing/json_test_support.h"

namespace tbdaily {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr DayNumber kToday = 20781;
constexpr const char* kLastDay = "LastCrashLogSerializationDateInDaysSince1970";
constexpr ServiceConnection kPeer = 2;

PlistDictionary operation(std::int64_t number) {
  return {{"operation", PlistValue::int64(number)}};
}

PlistValue app(const char* bundle, std::size_t uuidLength = 16) {
  return PlistValue::dictionary({{"bundle_id", PlistValue::string(bundle)},
                                 {"version", PlistValue::string("1.2")},
                                 {"kestrel_id", PlistValue::int64(-5)},
                                 {"arch", PlistValue::int64(2)},
                                 {"uuid", PlistValue::data(PlistData(uuidLength, std::byte{0xab}))}});
}

struct EntryTest : ::testing::Test {
  EntryTest() {
    gCommandState.gAppInfoRequested = false;
    gInternalDeviceAnswer.once.reset();
    gEnvironmentProbeCache = {};
    fake_.analyticsClient.today = kToday;
    fake_.logSubmission.enabled = true;
    fake_.usageService.records = PlistValue::array({});  // a reply at once
    fake_.analyticsHistory.addScalar("k", kToday - 1, 1);
    fake_.analyticsHistory.addScalar("k", kToday, 2);
    fake_.putPlist(kWhitelistPath, testing::dictionaryOf(R"({"G": {"ScalarKeys": {"k": {}}}})"));
  }

  // Runs the process and answers its log lines between the first and the last.
  std::vector<std::string> run(std::vector<const char*> arguments) {
    arguments.insert(arguments.begin(), "tbdaily");
    fake_.systemLog.lines.clear();
    EXPECT_EQ(runEntry(fake_.platform, static_cast<int>(arguments.size()), arguments.data()), 0);
    std::vector<std::string> lines = fake_.systemLog.lines;
    EXPECT_EQ(lines.front(), "default: tbdaily started");
    EXPECT_EQ(lines.back(), "default: tbdaily ended");
    return {lines.begin() + 1, lines.end() - 1};
  }
  PlistValue lastDay() { return fake_.preferences.getValue(kLastDay, "com.velmora.tallyd.tbdaily"); }
  // Runs the process as a listener to which a peer sends these messages.
  std::vector<std::string> receive(const std::vector<PlistDictionary>& messages) {
    gCommandState.commandOnce.reset();
    fake_.serviceListener.addPeer(kPeer);
    for (const PlistDictionary& message : messages) fake_.serviceListener.addMessage(kPeer, message);
    return run({});
  }
  PlistValue appInfoOfReport() {
    return fake_.plistOf(fake_.logSubmission.logs.back()).asDictionary()->get("TBActivatedAppInfo");
  }

  testing::FakePlatform fake_;
};

TEST_F(EntryTest, RunsOncePerDayAndRemembersTheDayAfterTheTasks) {
  EXPECT_THAT(run({"-d", "ignored"}), Contains("default: daily tasks for day 20780"));
  EXPECT_EQ(lastDay(), PlistValue::int32(kToday - 1));
  EXPECT_EQ(fake_.preferences.writes.back(), "synchronize com.velmora.tallyd.tbdaily");
  EXPECT_THAT(run({"-d"}), ElementsAre("default: Day unchanged since last run"));
  fake_.analyticsClient.today = kToday - 10;  // the clock was moved back
  EXPECT_THAT(run({"-d"}), ElementsAre("default: Day unchanged since last run"));
  fake_.analyticsClient.today = kToday + 5;
  EXPECT_THAT(run({"-d"}), Contains("default: daily tasks for day 20785"));
}

TEST_F(EntryTest, ForcedRunsNeitherReadNorWriteTheLastDay) {
  EXPECT_THAT(run({"-f"}), Contains("default: daily tasks for day 20780"));
  EXPECT_THAT(run({"-t"}), Contains("default: daily tasks for day 20781"));
  EXPECT_TRUE(lastDay().isNone());
  for (const char* argument : {"-D", "-dd", "", "--help"}) {
    EXPECT_THAT(run({argument}), ElementsAre("default: Unknown arg: " + std::string(argument)));
  }
  EXPECT_EQ(runEntry(fake_.platform, 0, nullptr), 0);
}

TEST_F(EntryTest, TheStepsRunInTheirOrderWithAndWithoutTheReport) {
  const std::tuple<DayNumber, bool, std::vector<std::string>> cases[] = {
      {5, true, {"enabled?", "dump", "roll"}},  // day 5 has no rows
      {kToday, true, {"enabled?", "write", "dump", "roll"}},
      {kToday, false, {"enabled?", "dump", "roll"}}};
  for (const auto& [day, isEnabled, calls] : cases) {
    fake_.logSubmission.calls.clear();
    fake_.logSubmission.enabled = isEnabled;
    RunDailyTasks(fake_.platform, day, {});
    EXPECT_EQ(fake_.logSubmission.calls, calls);
  }
  EXPECT_EQ(fake_.analyticsClient.calls[0], "checkpoint");
}

TEST_F(EntryTest, ADayCountsWhenItsRunWasAloneAndIsDurable) {
  fake_.runLock.isFree = false;
  for (const char* argument : {"-d", "-f", "-t"}) EXPECT_THAT(run({argument}), IsEmpty()) << argument;
  fake_.runLock.isFree = true;
  fake_.fileSystem.canBeMadeDurable = false;
  EXPECT_THAT(run({"-d"}), Contains("default: daily tasks for day 20780"));
  EXPECT_TRUE(lastDay().isNone());
  fake_.fileSystem.canBeMadeDurable = true;
  run({"-d"});
  EXPECT_EQ(lastDay(), PlistValue::int32(kToday - 1));
  EXPECT_FALSE(fake_.runLock.isHeld);
}

// A usage service that finds no thread for its reply.
struct ThreadlessUsage : UsageService {
  std::unique_ptr<UsageWorkspace> createWorkspace() override { throw std::runtime_error("no thread"); }
};

TEST_F(EntryTest, AStepThatThrowsEndsAlone) {
  ThreadlessUsage usage;
  Platform platform = platformWith(fake_.platform, usage);
  RunDailyTasksIfNewDay(platform, {});
  EXPECT_TRUE(fake_.systemLog.has("error: network usage could not be finished: no thread"));
  EXPECT_EQ(fake_.logSubmission.calls.back(), "roll");
  EXPECT_EQ(lastDay(), PlistValue::int32(kToday - 1));
}

TEST_F(EntryTest, TheListenerEndsAfterOneQuietSlice) {
  auto& listener = fake_.serviceListener;
  listener.addError(testing::FakeServiceListener::kListener);
  listener.addFinishedSlice();
  EXPECT_THAT(run({}), IsEmpty());
  EXPECT_EQ(listener.endpoint, "com.velmora.tallyd.tbdaily");
  EXPECT_THAT(listener.sliceSeconds, ElementsAre(10.0, 10.0, 10.0));
  listener.fails = true;
  EXPECT_THAT(run({}), IsEmpty());
  EXPECT_EQ(listener.sliceSeconds.size(), 4U);
}

TEST_F(EntryTest, AppInfoThatWasAskedForStandsInTheReport) {
  PlistDictionary info = operation(2 + (std::int64_t{7} << 32));
  info.set("app_data",
           PlistValue::array({app("one"), PlistValue::string("odd"), app("two", 15), app("three")}));
  // Nobody asked yet; no operation counts as 0; in the end nobody asks any more.
  const auto lines = receive({operation(2), {}, info, operation(2)});
  EXPECT_EQ(lines[0], "default: tbdaily got (unsolicited -- so ignoring) AAI:\n[]");
  EXPECT_EQ(lines[1], "default: notified of logging status, waiting for activate app info");
  EXPECT_TRUE(lines[2].starts_with("default: tbdaily got requestedAAI:\n[{\"bundle\": \"one\""));
  EXPECT_EQ(lines.back(), lines[0]);
  EXPECT_THAT(fake_.notifications.posts, ElementsAre("com.velmora.tallyd.tbdaily.logging"));
  EXPECT_EQ(fake_.logSubmission.logs.size(), 1U);
  const PlistValue appInfo = appInfoOfReport();
  ASSERT_EQ(appInfo.asArray()->size(), 2U);
  EXPECT_EQ(plistText((*appInfo.asArray())[1]),
            R"({"bundle": "three", "version": "1.2", "kestrelID": -5, "arch": 2, )"
            R"("uuid": "ABABABAB-ABAB-ABAB-ABAB-ABABABABABAB"})");
}

TEST_F(EntryTest, AnEmptyListIsAnAnswerAndOneThatNeverCameIsDoneWithout) {
  receive({operation(0), operation(2)});
  EXPECT_EQ(appInfoOfReport(), PlistValue::array({}));

  fake_.preferences.domains.clear();
  const auto lines = receive({operation(0), operation(1)});  // the guard is used up
  EXPECT_EQ(lines[1], "default: never received requested AAI, so moving along without it");
  EXPECT_EQ(lines[2], "default: daily tasks for day 20780");
  EXPECT_TRUE(appInfoOfReport().isNone());
}

TEST_F(EntryTest, ARunForADayBypassesTheRuleAndUsesUpTheGuard) {
  PlistDictionary message = operation(1);
  message.set("value", PlistValue::int64(-1));
  EXPECT_EQ(receive({message, operation(0)})[0], "default: daily tasks for day -1");
  EXPECT_THAT(fake_.notifications.posts, IsEmpty());
  EXPECT_FALSE(gCommandState.gAppInfoRequested);
  EXPECT_TRUE(lastDay().isNone());
  EXPECT_THAT(receive({operation(77), operation(1)}), IsEmpty());
}

}  // namespace
}  // namespace tbdaily

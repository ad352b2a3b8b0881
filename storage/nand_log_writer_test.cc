#include "storage/nand_log_writer.h"

#include <gmock/gmock.h>
#include <time.h>

#include <cmath>
#include <cstdlib>

#include "platform/number_text.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;

struct NandLog : ::testing::Test {
  NandLog() {
    setenv("TZ", "PST8PDT,M3.2.0,M11.1.0", 1);
    fake.kernel.now = dateOfCivilTime({2026, 11, 16, 17, 7, 4, 0.75});
  }
  ~NandLog() override {
    unsetenv("TZ");
    tzset();
  }
  // The text of the log that the dictionary becomes, from the date in its last line on.
  std::string body(const PlistDictionary& info) {
    fake.preferences.domains.clear();
    NLW_WriteLog(fake.platform, "165", &info);
    const std::string& text = fake.logSubmission.logs.back().bytes;
    return text.substr(text.find("\n\n") + 2);
  }
  PlistValue lastLogged() { return fake.preferences.ownValue("SSLastLoggedAt"); }

  testing::FakePlatform fake;
};

TEST_F(NandLog, HasItsHeaderAndOneLineOfEntries) {
  fake.logSubmission.identifier = "7f3e";
  fake.logSubmission.model = "V12,1";
  fake.logSubmission.version = "Velmora 9.2";
  body({{"UserWamp", PlistValue::float64(2.5)}, {"a", PlistValue::string("1")}, {"b", PlistValue::int64(7)}});
  EXPECT_EQ(fake.logSubmission.logs[0].type + fake.logSubmission.logs[0].name, "165StorageStatus");
  EXPECT_EQ(
      fake.logSubmission.logs[0].bytes,
      "System ID: 7f3e\nHardware Model: V12,1\nOS Version: Velmora 9.2\nDate: 2026-11-16 09:07:04 -0800\n"
      "Incident ID: incident-1\nFaultdesk Key: error\n\n"
      "2026-11-16 09:07:04 -0800 tbdaily[412]: UserWamp:2.50;b:7\n");
  EXPECT_THAT(fake.preferences.writes, ElementsAre("set com.velmora.sysmetrics.tbdaily/SSLastLoggedAt",
                                                   "synchronize com.velmora.sysmetrics.tbdaily"));
  fake.deviceAnswers.answers.set("InverseDeviceID", PlistValue::string("key"));
  EXPECT_EQ(GetFaultdeskKey(fake.deviceAnswers), "key");
}

TEST_F(NandLog, WritesNumbersByTheirKindAndArraysThatHoldOne) {
  const PlistValue text = PlistValue::string("x"), one = PlistValue::int32(1);
  const auto array = [](PlistArray elements) { return PlistValue::array(std::move(elements)); };
  const std::vector<std::pair<PlistValue, std::string>> cases = {
      {PlistValue::float32(0.25F), "k:0.25"},
      {PlistValue::float64(-INFINITY), "k:-inf"},
      {PlistValue::float64(0x1p1023), "k:" + std::to_string(0x1p1023).substr(0, 308) + ".00"},
      {PlistValue::int8(-3), "k:-3"},
      {PlistValue::boolean(true), "k:1"},
      {array({PlistValue::int32(3), PlistValue::int32(0), PlistValue::int32(12)}), "k:3,0,12"},
      {array({text, PlistValue::boolean(false), PlistValue::float64(2.5)}), "k:x,0,2.5"},
      {array({}), ""},
      {array({text, array({one})}), ""},
      {PlistValue(PlistDate{0}), ""},
      {PlistValue::dictionary({{"a", one}}), ""},
  };
  for (const auto& [value, line] : cases)
    EXPECT_EQ(body({{"k", value}}), "2026-11-16 09:07:04 -0800 tbdaily[412]: " + line + "\n");
}

TEST_F(NandLog, TellsTheTimeOfTheZone) {
  const std::vector<std::tuple<const char*, PlistDate, const char*>> cases = {
      {"PST8PDT,M3.2.0,M11.1.0", dateOfCivilTime({2026, 7, 1, 7}), "2026-07-01 00:00:00 -0700 "},
      {"<+0545>-5:45", dateOfCivilTime({2026, 12, 31, 18, 15}), "2027-01-01 00:00:00 +0545 "},
      {"<-0030>0:30", dateOfCivilTime({1969, 12, 31, 23, 59, 59, 0.5}), "1969-12-31 23:29:59 -0030 "},
      {"UTC0", dateOfCivilTime({800, 1, 2}), "0800-01-02 00:00:00 +0000 "},
      {"UTC0", {1e300}, "1970-01-01 00:00:00 +0000 "},
  };
  for (const auto& [zone, time, text] : cases) {
    setenv("TZ", zone, 1);
    fake.kernel.now = time;
    EXPECT_THAT(body({}), ::testing::StartsWith(text));
  }
}

TEST_F(NandLog, IsAttemptedOnceInSevenDays) {
  const PlistDictionary info;
  const auto attempts = [&](const PlistValue& last, const PlistDictionary* entries) {
    fake.preferences.setOwnValue("SSLastLoggedAt", last);
    NLW_WriteLog(fake.platform, "165", entries);
    return lastLogged() == PlistValue(fake.kernel.now);
  };
  fake.logSubmission.writeFails = true;
  const double now = fake.kernel.now.secondsSinceReference;
  EXPECT_FALSE(attempts({}, nullptr));
  EXPECT_TRUE(attempts(PlistValue(PlistDate{now - 604800}), &info));
  EXPECT_TRUE(attempts(PlistValue::string("2026-11-16"), &info));
  EXPECT_TRUE(fake.systemLog.lines.empty());
  EXPECT_FALSE(attempts(PlistValue(PlistDate{now - 604799}), &info));
  EXPECT_FALSE(attempts(PlistValue(PlistDate{now + 86400}), nullptr));  // the clock was set back
  EXPECT_EQ(fake.logSubmission.calls.size(), 2U);
  const std::string last = "NANDLogWriter:Last written at ",
                    current = " current 2026-11-16 17:07:04 +0000 :skipped";
  EXPECT_THAT(fake.systemLog.lines, ElementsAre(last + "2026-11-09 17:07:05 +0000" + current,
                                                last + "2026-11-17 17:07:04 +0000" + current));
}

struct FailingSubmission : testing::FakeLogSubmission {
  std::string systemVersion() override { return fail(), ""; }
  std::function<void()> fail;
};

TEST_F(NandLog, EndsWithALineWhenAServiceThrows) {
  auto& f = fake;
  FailingSubmission failing;
  Platform platform{
      f.driverRegistry,   f.preferences,       f.deviceAnswers, failing,        f.analyticsClient,
      f.analyticsHistory, f.propertyListCodec, f.stackSnapshot, f.usageService, f.appRegistry,
      f.localeSettings,   f.serviceListener,   f.notifications, f.systemLog,    f.kernel,
      f.fileSystem,       f.dynamicLoader,     f.messageDigest};
  const PlistDictionary info;
  failing.fail = [] { throw std::runtime_error("NoSpool"); };
  NLW_WriteLog(platform, "165", &info);
  failing.fail = [] { throw 5; };
  EXPECT_THROW(NLW_WriteLog(platform, "165", &info), int);
  EXPECT_THAT(fake.systemLog.lines, ElementsAre("An exception occurred: NoSpool"));
  EXPECT_TRUE(lastLogged().isNone());
}

}  // namespace
}  // namespace tbdaily

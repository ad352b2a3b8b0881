#include "storage/nand_log_writer.h"

#include <gmock/gmock.h>

#include <cstdlib>

#include "platform/calendar.h"
#include "platform/platform.h"
#include "testing/fake_platform.h"
#include "testing/json_test_support.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;

struct NandLog : ::testing::Test {
  NandLog() { fake.kernel.now = dateOfCivilTime({2026, 11, 16, 17, 7, 4, 0.75}); }
  ~NandLog() override { unsetenv("TZ"); }
  // The log that the dictionary becomes in that time zone.
  std::string text(const PlistDictionary& info, const char* zone = "PST8PDT,M3.2.0,M11.1.0") {
    setenv("TZ", zone, 1);
    fake.preferences.domains.clear();
    NLW_WriteLog(fake.platform, "165", &info);
    return fake.logSubmission.logs.back().bytes;
  }

  testing::FakePlatform fake;
};

TEST_F(NandLog, HasItsHeaderAndOneLineOfNumbersByTheirKind) {
  PlistDictionary info = testing::dictionaryOf(
      R"({"string": "x", "a": 0, "b": -8.98846567431158e307, "nested": ["x", [1]], "c": ["x", false, 2.5],
          "empty": [], "d": true, "ValidityList[2]": [1]})");
  info.set("a", PlistValue::float32(0.25F));
  info.set("date", PlistValue(PlistDate{0}));
  fake.logSubmission.identifier = "7f3e";
  fake.logSubmission.model = "V12,1";
  fake.logSubmission.version = "Velmora 9.2";
  EXPECT_EQ(
      text(info),
      "System ID: 7f3e\nHardware Model: V12,1\nOS Version: Velmora 9.2\nDate: 2026-11-16 09:07:04 -0800\n"
      "Incident ID: incident-1\nFaultdesk Key: error\n\n"
      "2026-11-16 09:07:04 -0800 tbdaily[412]: a:0.25;b:" +
          std::to_string(-0x1p1023).substr(0, 309) + ".00;c:x,0,2.5;d:1;ValidityList[2]:1\n");
  EXPECT_EQ(fake.logSubmission.logs[0].type + fake.logSubmission.logs[0].name, "165StorageStatus");
  EXPECT_EQ(fake.preferences.writes.back(), "synchronize com.velmora.sysmetrics.tbdaily");
  EXPECT_THAT(text({}), ::testing::EndsWith(" tbdaily[412]: \n"));
  fake.deviceAnswers.answers.set("InverseDeviceID", PlistValue::string("key"));
  EXPECT_EQ(GetFaultdeskKey(fake.deviceAnswers), "key");
}

TEST_F(NandLog, TellsTheTimeOfTheZone) {
  fake.kernel.now = dateOfCivilTime({1969, 12, 31, 23, 59, 59, 0.5});
  EXPECT_THAT(text({}, "<-0030>0:30"), ::testing::HasSubstr("\n1969-12-31 23:29:59 -0030 "));
  fake.kernel.now = {1e300};
  EXPECT_THAT(text({}, "UTC0"), ::testing::HasSubstr("\n1970-01-01 00:00:00 +0000 "));
}

TEST_F(NandLog, IsAttemptedOnceInSevenDays) {
  const PlistDictionary info;
  const auto attempts = [&](const PlistValue& last, const PlistDictionary* entries) {
    fake.preferences.setOwnValue("SSLastLoggedAt", last);
    NLW_WriteLog(fake.platform, "165", entries);
    return fake.preferences.ownValue("SSLastLoggedAt") == PlistValue(fake.kernel.now);
  };
  fake.logSubmission.writeFails = true;
  const double now = fake.kernel.now.secondsSinceReference;
  EXPECT_FALSE(attempts({}, nullptr));
  EXPECT_TRUE(attempts(PlistValue(PlistDate{now - 604800}), &info));
  EXPECT_TRUE(attempts(PlistValue::string("2026-11-16"), &info));
  EXPECT_TRUE(fake.systemLog.lines.empty());
  EXPECT_FALSE(attempts(PlistValue(PlistDate{now - 604799}), &info));
  EXPECT_FALSE(attempts(PlistValue(PlistDate{now + 86400}), nullptr));  // the clock was set back
  const std::string last = "NANDLogWriter:Last written at ",
                    rest = " current 2026-11-16 17:07:04 +0000 :skipped";
  EXPECT_THAT(fake.systemLog.lines, ElementsAre(last + "2026-11-09 17:07:05 +0000" + rest,
                                                last + "2026-11-17 17:07:04 +0000" + rest));
}

TEST_F(NandLog, EndsWithALineWhenAServiceThrows) {
  struct : testing::FakeLogSubmission {
    std::string systemVersion() override { throw std::runtime_error("NoSpool"); }
  } failing;
  Platform platform = platformWith(fake.platform, failing);
  const PlistDictionary info;
  NLW_WriteLog(platform, "165", &info);
  EXPECT_THAT(fake.systemLog.lines, ElementsAre("An exception occurred: NoSpool"));
  EXPECT_TRUE(fake.preferences.writes.empty());
}

}  // namespace
}  // namespace tbdaily

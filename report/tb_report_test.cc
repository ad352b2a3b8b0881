#include "report/tb_report.h"

#include <gmock/gmock.h>

#include "platform/plist_text.h"
#include "report/internal_device.h"
#include "testing/fake_platform.h"
#include "testing/json_test_support.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr DayNumber kDay = 20780;

using testing::dictionaryOf;
using testing::plistOf;

std::vector<std::string> keysOf(const PlistDictionary& dictionary) {
  std::vector<std::string> keys;
  for (const auto& [key, value] : dictionary) keys.push_back(key);
  return keys;
}

struct TBReportTest : ::testing::Test {
  TBReportTest() {
    gInternalDeviceAnswer.once.reset();
    fake_.logSubmission.osVersion = "17.4";
    fake_.analyticsHistory.addScalar("k", kDay, 1);
    allow(R"({"ScalarKeys": {"k": {}}})");
  }

  void allow(const std::string& tables) {
    fake_.putPlist(kWhitelistPath, dictionaryOf("{\"G\": " + tables + "}"));
  }
  void writeLog(const PlistValue& appInfo = {}) {
    TBReport(fake_.platform, {[] { return 1; }, [] { return 7; }})
        .writeLogForYesterdayWithAppInfo(kDay, appInfo);
  }
  // The root of the report that this writes.
  PlistDictionary write(const PlistValue& appInfo = {}) {
    writeLog(appInfo);
    return *fake_.plistOf(fake_.logSubmission.logs.at(0)).asDictionary();
  }

  testing::FakePlatform fake_;
};

TEST_F(TBReportTest, CarriesTheWhitelistedRowsOfTwoDaysTheLaterOneWinning) {
  allow(R"({"ScalarKeys": {"k": {}, "old": {}},
            "DistributionKeys": {"d": {"intervals": [10]}, "empty": {}}})");
  fake_.analyticsHistory.addScalar("k", kDay - 1, 9);
  fake_.analyticsHistory.addScalar("old", kDay - 1, 3);
  fake_.analyticsHistory.addScalar("old", kDay - 2, 4);
  fake_.analyticsHistory.addScalar("secret", kDay, 5);
  fake_.analyticsHistory.addDistribution("d", kDay, {10, 11});
  fake_.analyticsHistory.addDistribution("secret", kDay, {1, 2, 3});
  const PlistDictionary root = write();
  EXPECT_EQ(plistText(root.get("TBScalars")), R"({"k": 1, "old": 3})");
  EXPECT_EQ(plistText(root.get("TBDistributions")), R"({"d": [10, 11, 10.5, 0.5, 2]})");
  EXPECT_EQ(plistText(root.get("TBDistributionsHistogram")),
            "{\"d\": {\"(-inf, 10]\": 1, \"(10, inf)\": 1}}");
  EXPECT_LE(fake_.analyticsHistory.valuesAskedFor, 4);  // the dropped row's values were never asked for
  EXPECT_TRUE(fake_.systemLog.has("info: writing tallyd log. yesterday=20780"));
  EXPECT_TRUE(fake_.systemLog.has("debug: Treating key d as a histogram"));
}

TEST_F(TBReportTest, IsWrittenOnce) {
  TBReport report(fake_.platform, {[] { return 1; }, [] { return 7; }});
  for (int i = 0; i < 2; ++i) report.writeLogForYesterdayWithAppInfo(kDay, PlistValue());
  EXPECT_EQ(fake_.logSubmission.logs.size(), 1U);
}

TEST_F(TBReportTest, HasExactlyTheRootEntriesWithSubstitutesForWhatIsAbsent) {
  const PlistDictionary root = write();
  EXPECT_THAT(keysOf(root), ElementsAre("TBCrashLogVersion", "TBStartDate", "TBLogCreationDate", "TBMetadata",
                                        "TBScalars", "TBDistributions", "TBDistributionsHistogram",
                                        "TBTasking", "TBTaskID", "TBTaskDigest", "TBWhitelistDigest"));
  EXPECT_THAT(fake_.propertyListCodec.forms, ElementsAre(PlistForm::Plain));
  EXPECT_EQ(fake_.logSubmission.logs[0].type + fake_.logSubmission.logs[0].name, "193log-tallyd");
}

TEST_F(TBReportTest, IsNotWrittenWhenNothingWhitelistedHappened) {
  allow(R"({"ScalarKeys": {"com.velmora.homedeck.numAllInstalledApps": {}}})");
  writeLog();
  fake_.fileSystem.files.clear();
  writeLog();
  EXPECT_THAT(fake_.logSubmission.logs, IsEmpty());
  EXPECT_EQ(fake_.appRegistry.enumerations, 0);
  EXPECT_THAT(fake_.preferences.writes, IsEmpty());
}

TEST_F(TBReportTest, RemembersTheOSVersionBeforeTheLogIsWritten) {
  fake_.propertyListCodec.fault = "too odd";
  writeLog();
  EXPECT_TRUE(fake_.systemLog.has("error: Could not create tallyd plist: too odd"));
  EXPECT_THAT(fake_.preferences.writes, IsEmpty());

  fake_.logSubmission.writeFails = true;
  writeLog();
  EXPECT_TRUE(fake_.systemLog.has("error: Failed to write tallyd log"));
  EXPECT_THAT(fake_.preferences.writes, ElementsAre("set com.velmora.tallyd.tbdaily/LastOSVersion",
                                                    "synchronize com.velmora.tallyd.tbdaily"));
  fake_.logSubmission.writeFails = false;
  fake_.preferences.domains.clear();
  const std::pair<const char*, PlistValue> runs[] = {
      {"17.4", plistOf(R"({"previous_os_version": "<unknown>"})")},
      {"17.4", {}},
      {"17.5", plistOf(R"({"previous_os_version": "17.4"})")}};
  for (const auto& [version, options] : runs) {
    fake_.logSubmission.osVersion = version;
    writeLog();
    EXPECT_EQ(fake_.logSubmission.logs.back().options, options);
  }
}

TEST_F(TBReportTest, MeasuresOnlyWhatIsAllowedAndCarriesTaskingAndAppInfoAsTheyStand) {
  fake_.localeSettings.country = "AT";
  fake_.localeSettings.preferred = {"de-AT", "en"};
  fake_.preferences.domains["com.velmora.tallyd.tbdaily"] =
      dictionaryOf(R"({"TaskingID": "t1", "TaskingDigest": 9, "TaskingPayload": [{}]})");
  const PlistDictionary root = write(PlistValue::array({}));
  EXPECT_EQ(plistText(root.get("TBMetadata")),
            R"({"TBUserInterfaceLanguage": "<unknown>", "TBPreferredUserInterfaceLanguage": "de-AT", )"
            R"("TBUserSetRegionFormat": "AT"})");
  EXPECT_EQ(root.get("TBTaskID").asString(), "t1");
  EXPECT_EQ(root.get("TBTaskDigest").asInteger(), 9);
  EXPECT_EQ(root.get("TBTasking"), plistOf("[{}]"));
  EXPECT_EQ(root.get("TBActivatedAppInfo"), PlistValue::array({}));
  EXPECT_EQ(plistText(root.get("TBScalars")), R"({"k": 1})");
  EXPECT_THAT(fake_.kernel.asked, IsEmpty());
  EXPECT_EQ(fake_.appRegistry.enumerations + fake_.dynamicLoader.opens, 0);
}

TEST_F(TBReportTest, MeasuresTheSystem) {
  const PlistValue measured = plistOf(R"({
      "k": 1,
      "com.velmora.homedeck.numThirdPartyApps": 2,
      "com.velmora.sysmetrics.tbkd.database.size": 1,
      "com.velmora.sysmetrics.tbkd.database.corruptions": 7,
      "com.velmora.usage.cur_boot_session_cpu_uptime": 2500,
      "com.velmora.kernel.memorystatus_freeze_count": 4294967295,
      "com.velmora.kernel.memorystatus_freeze_pageouts": 144680345676153346,
      "com.velmora.kernel.memorystatus_freeze_budget_pages_remaining": 217020518514230019,
      "com.velmora.kernel.memorystatus_thaw_count": -1,
      "com.velmora.kernel.swapusage": 72340172838076673})");
  PlistDictionary keys;
  for (const auto& [key, value] : *measured.asDictionary()) keys.set(key, plistOf("{}"));
  fake_.putPlist(kWhitelistPath,
                 {{"G", PlistValue::dictionary({{"ScalarKeys", PlistValue::dictionary(keys)}})}});
  fake_.appRegistry.bundleTypes = {"User", "System", "User"};
  fake_.fileSystem.sizes["/var/mobile/Library/Tallybook/TBDataStore.sqlitedb"] = 1048576;
  fake_.kernel.ticks = 3600000000000;
  fake_.kernel.ratio = Timebase{125, 3};
  fake_.kernel.sysctls["kern.memorystatus_freeze_count"] = PlistData(4, std::byte{0xff});
  fake_.kernel.sysctls["kern.memorystatus_freeze_pageouts"] = PlistData(8, std::byte{0x02});
  fake_.kernel.sysctls["kern.memorystatus_freeze_budget_pages_remaining"] = PlistData(8, std::byte{0x03});
  fake_.kernel.sysctls["vm.swapusage"] = PlistData(32, std::byte{0x01});
  EXPECT_EQ(write().get("TBScalars"), measured);
  fake_.kernel.ratio = Timebase{1, 0};
  writeLog();
  EXPECT_TRUE(fake_.systemLog.has("error: Couldn't retrieve mach_timebase_info"));
  const PlistValue scalars = fake_.plistOf(fake_.logSubmission.logs.at(1)).asDictionary()->get("TBScalars");
  EXPECT_EQ(scalars.asDictionary()->get("com.velmora.usage.cur_boot_session_cpu_uptime"),
            PlistValue::int64(-1));
}

}  // namespace
}  // namespace tbdaily

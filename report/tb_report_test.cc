#include "report/tb_report.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "driver/environment_probes.h"
#include "report/internal_device.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr DayNumber kDay = 20780;
constexpr const char* kSupportLibrary =
    "/System/Library/PrivateFrameworks/FaultdeskSupport.framework/FaultdeskSupport";

PlistValue dict(PlistDictionary entries = {}) {
  return PlistValue::dictionary(std::move(entries));
}
std::int64_t corruptions = 0;

class TBReportTest : public ::testing::Test {
 protected:
  TBReportTest() {
    gInternalDeviceAnswer.once.reset();
    gEnvironmentProbeCache = {};
    fake_.logSubmission.osVersion = "17.4";
  }

  void allow(std::initializer_list<const char*> scalars, PlistDictionary distributions = {}) {
    PlistDictionary keys;
    for (const char* key : scalars) keys.set(key, dict());
    fake_.putPlist(
        kWhitelistPath,
        {{"G", dict({{"ScalarKeys", dict(keys)}, {"DistributionKeys", dict(std::move(distributions))}})}});
  }
  // The root of the only report that was written.
  PlistDictionary write(const PlistValue& appInfo = {}) {
    TBReport(fake_.platform).writeLogForYesterdayWithAppInfo(kDay, appInfo);
    EXPECT_EQ(fake_.logSubmission.logs.size(), 1U);
    if (fake_.logSubmission.logs.empty()) return {};
    return *fake_.plistOf(fake_.logSubmission.logs.back()).asDictionary();
  }
  std::vector<std::string> keysOf(const PlistValue& dictionary) {
    std::vector<std::string> keys;
    for (const auto& [key, value] : *dictionary.asDictionary()) keys.push_back(key);
    return keys;
  }

  testing::FakePlatform fake_;
};

TEST_F(TBReportTest, CarriesTheWhitelistedRowsOfTwoDaysTheLaterOneWinning) {
  allow({"both", "old"},
        {{"d", dict({{"intervals", PlistValue::array({PlistValue::int64(10)})}})}, {"empty", dict()}});
  fake_.analyticsHistory.addScalar("both", kDay - 1, 1);
  fake_.analyticsHistory.addScalar("both", kDay, 2);
  fake_.analyticsHistory.addScalar("old", kDay - 1, 3);
  fake_.analyticsHistory.addScalar("older", kDay - 2, 4);
  fake_.analyticsHistory.addScalar("secret", kDay, 5);
  fake_.analyticsHistory.addDistribution("d", kDay, {10, 11});
  fake_.analyticsHistory.addDistribution("secret", kDay, {1, 2, 3});
  const PlistDictionary root = write();
  EXPECT_EQ(root.get("TBScalars"), dict({{"both", PlistValue::int64(2)}, {"old", PlistValue::int64(3)}}));
  EXPECT_EQ(root.get("TBDistributions"),
            dict({{"d", PlistValue::array({PlistValue::float64(10), PlistValue::float64(11),
                                           PlistValue::float64(10.5), PlistValue::float64(0.5),
                                           PlistValue::int32(2)})}}));
  EXPECT_EQ(root.get("TBDistributionsHistogram"),
            dict({{"d", dict({{"(-inf, 10]", PlistValue::int64(1)}, {"(10, inf)", PlistValue::int64(1)}})}}));
  EXPECT_LE(fake_.analyticsHistory.valuesAskedFor, 4);  // the dropped row's values were never asked for
  EXPECT_TRUE(fake_.systemLog.has("info: writing tallyd log. yesterday=20780"));
  EXPECT_TRUE(fake_.systemLog.has("debug: Treating key d as a histogram"));
}

TEST_F(TBReportTest, HasExactlyTheRootEntriesWithSubstitutesForWhatIsAbsent) {
  allow({"k"});
  fake_.analyticsHistory.addScalar("k", kDay, 1);
  fake_.kernel.now = PlistDate::fromUnixSeconds(1795597624.25);
  const PlistDictionary root = write();
  EXPECT_THAT(keysOf(dict(root)),
              ElementsAre("TBCrashLogVersion", "TBStartDate", "TBLogCreationDate", "TBMetadata", "TBScalars",
                          "TBDistributions", "TBDistributionsHistogram", "TBTasking", "TBTaskID",
                          "TBTaskDigest", "TBWhitelistDigest"));
  EXPECT_EQ(root.get("TBStartDate").asDate()->unixSeconds(), kDay * 86400.0);
  EXPECT_EQ(root.get("TBLogCreationDate").asDate()->unixSeconds(), 1795597624.25);
  EXPECT_EQ(root.get("TBTasking"), PlistValue::array({}));
  EXPECT_EQ(root.get("TBTaskID").asString(), "(no tasking id)");
  EXPECT_EQ(root.get("TBTaskDigest").asString(), "(no tasking digest)");
  EXPECT_THAT(fake_.propertyListCodec.forms, ElementsAre(PlistForm::Plain));
  EXPECT_EQ(fake_.logSubmission.logs[0].type, "193");
  EXPECT_EQ(fake_.logSubmission.logs[0].name, "log-tallyd");
}

TEST_F(TBReportTest, CarriesTaskingAndAppInfoAsTheyStand) {
  allow({"k"});
  fake_.analyticsHistory.addScalar("k", kDay, 1);
  fake_.preferences.domains["com.velmora.tallyd.tbdaily"] = {{"TaskingID", PlistValue::string("t1")},
                                                             {"TaskingDigest", PlistValue::int64(9)},
                                                             {"TaskingPayload", PlistValue::array({dict()})}};
  const PlistDictionary root = write(PlistValue::array({}));
  EXPECT_EQ(root.get("TBTaskID").asString(), "t1");
  EXPECT_EQ(root.get("TBTaskDigest").asInteger(), 9);
  EXPECT_EQ(root.get("TBTasking"), PlistValue::array({dict()}));
  EXPECT_EQ(root.get("TBActivatedAppInfo"), PlistValue::array({}));
}

TEST_F(TBReportTest, IsNotWrittenWhenNothingWhitelistedHappened) {
  allow({"com.velmora.homedeck.numAllInstalledApps"});
  fake_.analyticsHistory.addScalar("secret", kDay, 1);
  TBReport(fake_.platform).writeLogForYesterdayWithAppInfo(kDay, {});
  fake_.fileSystem.files.clear();
  TBReport(fake_.platform).writeLogForYesterdayWithAppInfo(kDay, {});
  EXPECT_THAT(fake_.logSubmission.logs, IsEmpty());
  EXPECT_EQ(fake_.appRegistry.enumerations, 0);
  EXPECT_THAT(fake_.preferences.writes, IsEmpty());
}

TEST_F(TBReportTest, RemembersTheOSVersionBeforeTheLogIsWritten) {
  allow({"k"});
  fake_.analyticsHistory.addScalar("k", kDay, 1);
  const auto run = [this] { TBReport(fake_.platform).writeLogForYesterdayWithAppInfo(kDay, {}); };
  const auto remembered = [this] {
    return fake_.preferences.getValue("LastOSVersion", "com.velmora.tallyd.tbdaily");
  };

  fake_.propertyListCodec.failNextWrite("too odd");
  run();
  EXPECT_TRUE(fake_.systemLog.has("error: Could not create tallyd plist: too odd"));
  EXPECT_TRUE(remembered().isNone());

  fake_.logSubmission.writeFails = true;
  run();
  EXPECT_TRUE(fake_.systemLog.has("error: Failed to write tallyd log"));
  EXPECT_EQ(remembered().asString(), "17.4");
  EXPECT_THAT(fake_.preferences.writes, ElementsAre("set com.velmora.tallyd.tbdaily/LastOSVersion",
                                                    "synchronize com.velmora.tallyd.tbdaily"));
  fake_.logSubmission.writeFails = false;
  fake_.preferences.domains.clear();
  run();
  run();
  fake_.logSubmission.osVersion = "17.5";
  run();
  ASSERT_EQ(fake_.logSubmission.logs.size(), 3U);
  EXPECT_EQ(fake_.logSubmission.logs[0].options,
            dict({{"previous_os_version", PlistValue::string("<unknown>")}}));
  EXPECT_TRUE(fake_.logSubmission.logs[1].options.isNone());
  EXPECT_EQ(fake_.logSubmission.logs[2].options, dict({{"previous_os_version", PlistValue::string("17.4")}}));
}

TEST_F(TBReportTest, MeasuresOnlyWhatIsAllowed) {
  allow({"k"});
  fake_.analyticsHistory.addScalar("k", kDay, 1);
  fake_.localeSettings.country = "AT";
  fake_.localeSettings.preferred = {"de-AT", "en"};
  const PlistDictionary root = write();
  EXPECT_EQ(root.get("TBMetadata"), dict({{"TBUserInterfaceLanguage", PlistValue::string("<unknown>")},
                                          {"TBPreferredUserInterfaceLanguage", PlistValue::string("de-AT")},
                                          {"TBUserSetRegionFormat", PlistValue::string("AT")}}));
  EXPECT_EQ(keysOf(root.get("TBScalars")), std::vector<std::string>{"k"});
  EXPECT_THAT(fake_.kernel.asked, IsEmpty());
  EXPECT_EQ(fake_.appRegistry.enumerations, 0);
  EXPECT_EQ(fake_.dynamicLoader.opens, 0);
}

TEST_F(TBReportTest, MeasuresTheSystem) {
  allow({"k", "com.velmora.homedeck.numThirdPartyApps", "com.velmora.sysmetrics.tbkd.database.size",
         "com.velmora.sysmetrics.tbkd.database.corruptions", "com.velmora.usage.cur_boot_session_cpu_uptime",
         "com.velmora.kernel.memorystatus_freeze_count", "com.velmora.kernel.memorystatus_freeze_pageouts",
         "com.velmora.kernel.swapusage"});
  fake_.analyticsHistory.addScalar("k", kDay, 1);
  fake_.appRegistry.bundleTypes = {"User", "System", "User"};
  fake_.fileSystem.sizes["/var/mobile/Library/Tallybook/TBDataStore.sqlitedb"] = 1048576;
  fake_.dynamicLoader.library = kSupportLibrary;
  corruptions = 3;
  const PreferencesGetInteger get = [](const char*, const char*, bool*) { return corruptions; };
  const PreferencesSetValue set = [](const char*, std::int64_t value, const char*) { corruptions = value; };
  fake_.dynamicLoader.symbols = {{"SMXPreferencesGetIntegerValue", reinterpret_cast<void*>(get)},
                                 {"SMXPreferencesSetValue", reinterpret_cast<void*>(set)}};
  fake_.kernel.ticks = 3600000000000;
  fake_.kernel.ratio = Timebase{125, 3};
  fake_.kernel.sysctls["kern.memorystatus_freeze_count"] = PlistData(4, std::byte{0xff});
  fake_.kernel.sysctls["vm.swapusage"] = PlistData(32, std::byte{0x01});
  const PlistDictionary root = write();
  EXPECT_EQ(root.get("TBScalars"),
            dict({{"k", PlistValue::int64(1)},
                  {"com.velmora.homedeck.numThirdPartyApps", PlistValue::int64(2)},
                  {"com.velmora.sysmetrics.tbkd.database.size", PlistValue::int64(1)},
                  {"com.velmora.sysmetrics.tbkd.database.corruptions", PlistValue::int64(3)},
                  {"com.velmora.usage.cur_boot_session_cpu_uptime", PlistValue::int64(2500)},
                  {"com.velmora.kernel.memorystatus_freeze_count", PlistValue::int64(4294967295)},
                  {"com.velmora.kernel.memorystatus_freeze_pageouts", PlistValue::int64(-1)},
                  {"com.velmora.kernel.swapusage", PlistValue::int64(0x0101010101010101)}}));
  EXPECT_EQ(corruptions, 0);
}

TEST_F(TBReportTest, AMissingTimebaseIsReportedAsMinusOne) {
  allow({"com.velmora.usage.cur_boot_session_cpu_uptime"});
  fake_.kernel.ratio = Timebase{1, 0};
  TBReport report(fake_.platform);
  report.reportCPUUptime();
  EXPECT_EQ(report.scalarsOutput().get("com.velmora.usage.cur_boot_session_cpu_uptime").asInteger(), -1);
  EXPECT_TRUE(fake_.systemLog.has("error: Couldn't retrieve mach_timebase_info"));
}

}  // namespace
}  // namespace tbdaily

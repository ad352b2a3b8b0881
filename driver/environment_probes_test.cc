#include "driver/environment_probes.h"

#include <gmock/gmock.h>

#include "platform/platform.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;

constexpr const char* kContainer = "systemgroup.com.velmora.sysmetrics";
std::vector<std::string> calls;

std::int64_t getCount(const char* key, const char* domain, bool* valid) {
  calls.push_back(std::string("get ") + domain + "/" + key + (valid == nullptr ? "" : " with flag"));
  return 7;
}
void setCount(const char* key, std::int64_t value, const char* domain) {
  calls.push_back(std::string("set ") + domain + "/" + key + " " + std::to_string(value));
}

struct EnvironmentProbesTest : ::testing::Test {
  EnvironmentProbesTest() { gEnvironmentProbeCache = {}; }
  testing::FakePlatform fake_;
};

TEST_F(EnvironmentProbesTest, TheMarkerForcesMultiUserModeOnInternalBuildsOnly) {
  fake_.fileSystem.sizes["/var/db/forceMultiUserMode"] = 0;
  fake_.deviceAnswers.containers[kContainer] = "/group";
  EXPECT_EQ(*GetAnalyticsHomePath(fake_.platform), "/var/mobile");

  AnalyticsHome internalDevice(fake_.deviceAnswers, fake_.fileSystem);
  Platform platform = platformWith(fake_.platform, internalDevice);
  fake_.deviceAnswers.answers.set("InternalBuild", PlistValue::boolean(true));
  fake_.deviceAnswers.multiUser = false;
  for (int i = 0; i < 2; ++i) EXPECT_EQ(*GetAnalyticsHomePath(platform), "/group");
  EXPECT_THAT(fake_.systemLog.lines,
              ElementsAre("default: Forcing Multi User Mode behavior due to the presence of "
                          "/var/db/forceMultiUserMode"));
}

TEST_F(EnvironmentProbesTest, AMissingContainerIsLookedUpAgain) {
  fake_.deviceAnswers.multiUser = true;
  EXPECT_EQ(GetAnalyticsHomePath(fake_.platform), nullptr);
  EXPECT_EQ(GetDatabaseSizeMB(fake_.platform), -1);
  fake_.deviceAnswers.multiUser = false;  // the decision stands
  fake_.deviceAnswers.containers[kContainer] = "/group";
  fake_.fileSystem.sizes["/group/Library/Tallybook/TBDataStore.sqlitedb"] = 3 * 1048576 - 1;
  EXPECT_EQ(GetDatabaseSizeMB(fake_.platform), 2);
  const std::string error = "default: Error getting system group container: 2";
  EXPECT_THAT(fake_.systemLog.lines, ElementsAre(error, error));
}

TEST_F(EnvironmentProbesTest, TheCorruptionCountIsTakenThroughTheBoundFunctions) {
  EXPECT_EQ(TakeDatabaseCorruptionCount(fake_.platform), 0);
  fake_.dynamicLoader.library = std::string(kSupportLibraryPath);
  fake_.dynamicLoader.symbols["SMXPreferencesGetIntegerValue"] = reinterpret_cast<void*>(&getCount);
  EXPECT_EQ(TakeDatabaseCorruptionCount(fake_.platform), 0);
  fake_.dynamicLoader.symbols["SMXPreferencesSetValue"] = reinterpret_cast<void*>(&setCount);
  for (int i = 0; i < 2; ++i) EXPECT_EQ(TakeDatabaseCorruptionCount(fake_.platform), 7);
  EXPECT_EQ(fake_.dynamicLoader.opens, 3);
  const std::string count = "com.velmora.tallyd/DatabaseCorruptionCount";
  EXPECT_THAT(calls,
              ElementsAre("get " + count, "set " + count + " 0", "get " + count, "set " + count + " 0"));
  EXPECT_THAT(fake_.systemLog.lines,
              ElementsAre("error: Failed to dynamically load the FaultdeskSupport framework",
                          "error: Failed to dynamically link SMXPreferencesSetValue"));
  fake_.dynamicLoader.symbols.clear();
  LinkPreferenceFunctions(fake_.platform);
  EXPECT_TRUE(fake_.systemLog.has("error: Failed to dyanmically link SMXPreferencesGetIntegerValue"));
}

}  // namespace
}  // namespace tbdaily

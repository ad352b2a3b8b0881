#include "report/tb_config.h"

#include <gmock/gmock.h>

#include "report/internal_device.h"
#include "testing/fake_platform.h"
#include "testing/json_test_support.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;

struct TBConfigTest : ::testing::Test {
  TBConfigTest() { gInternalDeviceAnswer.once.reset(); }

  std::unique_ptr<TBConfig> load(std::string_view groups) {
    fake_.putPlist(kWhitelistPath, testing::dictionaryOf(groups));
    return TBConfig::init(fake_.platform);
  }
  // The bucket interval that a scalar key gets; -1 when it may not be reported, 0 when its options have none.
  static std::int64_t bucketOf(const TBConfig& config, std::string_view key) {
    const PlistDictionary* options = config.configOptionsForScalarKey(key);
    return options == nullptr ? -1 : options->get("bucket_interval").asInteger().value_or(0);
  }

  testing::FakePlatform fake_;
};

TEST_F(TBConfigTest, ExactEntriesBeatPrefixesAndLaterGroupsReplaceEarlierOnes) {
  const auto config = load(R"({
      "A": {"ScalarKeys": {"net.x": {}, "both": {"bucket_interval": 1}}, "Comment": "passed over",
            "ScalarKeyPrefixes": {"net.": {"bucket_interval": 2}, "net.wifi.": {"bucket_interval": 3},
                                  "": {"bucket_interval": 4}}},
      "B": {"ScalarKeys": {"both": {"bucket_interval": 5}},
            "DistributionKeys": {"dist": {}}, "DistributionKeyPrefixes": {"d.": {}}}})");
  ASSERT_NE(config, nullptr);
  for (const auto& [key, interval] :
       {std::pair("net.x", 0), {"net.wifi.rssi", 2}, {"both", 5}, {"unlisted", -1}, {"dist", -1}})
    EXPECT_EQ(bucketOf(*config, key), interval) << key;
  for (const char* key : {"dist", "d.x"}) EXPECT_NE(config->configOptionsForDistributionKey(key), nullptr);
  EXPECT_EQ(config->configOptionsForDistributionKey("net.x"), nullptr);
  EXPECT_EQ(config->match(KeyKind::Scalar, "both")->group, "B");
  EXPECT_THAT(fake_.systemLog.lines,
              ElementsAre("debug: prefix match net. for net.wifi.rssi", "debug: prefix match d. for d.x"));
}

TEST_F(TBConfigTest, TaskingSwitchesGroupsOffOnOrdinaryDevices) {
  constexpr const char* kGroups = R"({"Off": {"ScalarKeys": {"off": {}}}, "Odd": {"ScalarKeys": {"odd": {}}},
                                      "InternalTesting": {"ScalarKeys": {"internal": {}}}})";
  fake_.preferences.domains["com.velmora.da"] = testing::dictionaryOf(R"({"Off": false, "Odd": 0})");
  const auto ordinary = load(kGroups);
  for (const auto& [key, interval] : {std::pair("off", -1), {"odd", 0}, {"internal", -1}})
    EXPECT_EQ(bucketOf(*ordinary, key), interval) << key;
  EXPECT_THAT(fake_.systemLog.lines, ElementsAre("default: keyGroup Off is disabled by tasking"));

  gInternalDeviceAnswer.once.reset();
  fake_.systemLog.lines.clear();
  fake_.deviceAnswers.answers.set("InternalBuild", PlistValue::boolean(true));
  const auto internal = load(kGroups);
  for (const char* key : {"off", "internal"}) EXPECT_EQ(bucketOf(*internal, key), 0) << key;
  EXPECT_EQ(internal->configOptionsForScalarKey("anything")->size(), 0U);
  EXPECT_THAT(fake_.systemLog.lines,
              ElementsAre("debug: passing @{} for anything as device is Velmora Internal"));
}

TEST_F(TBConfigTest, EntriesThatAreNotUnderstoodAreSkippedByNameAndTheRestLoads) {
  const auto config = load(R"({"NoGroup": "?", "G": {"DistributionKeys": "?", "ScalarKeys": {
      "a": "?", "b": {"bucket_interval": "?"}, "c": {"sig_fig": true}, "d": {"intervals": ["?"]},
      "e": {"unknown": "?"}, "f": {"sig_fig": 2.0}}}})");
  ASSERT_NE(config, nullptr);
  for (const char* key : {"a", "b", "c", "d"}) EXPECT_EQ(bucketOf(*config, key), -1) << key;
  for (const char* key : {"e", "f"}) EXPECT_EQ(bucketOf(*config, key), 0) << key;
  const auto unreadable = [](const std::string& key) {
    return "error: options of whitelist key " + key +
           " in G/ScalarKeys cannot be read; what it matches is not reported";
  };
  EXPECT_THAT(fake_.systemLog.lines,
              ElementsAre("error: whitelist group NoGroup is no dictionary and is skipped",
                          "error: whitelist entry G/DistributionKeys is no dictionary and is skipped",
                          "error: options of whitelist key a in G/ScalarKeys are no dictionary; what it "
                          "matches is not reported",
                          unreadable("b"), unreadable("c"), unreadable("d")));
}

TEST_F(TBConfigTest, AnEntryThatCannotBeReadShadowsEverythingBehindIt) {
  fake_.deviceAnswers.answers.set("InternalBuild", PlistValue::boolean(true));
  const auto config = load(R"({"A": {"ScalarKeys": {"k": {}, "mended": "?"},
                                     "ScalarKeyPrefixes": {"net.": {"sig_fig": "?"}, "net.wifi.": {}, "k": {}}},
                               "B": {"ScalarKeys": {"k": {"bucket_interval": "100"}, "mended": {}, "net.exact": {}}}})");
  for (const char* key : {"k", "net.x", "net.wifi.x"}) {
    EXPECT_EQ(bucketOf(*config, key), -1) << key;
    EXPECT_TRUE(config->unreadableEntry(KeyKind::Scalar, key)) << key;
  }
  for (const char* key : {"mended", "net.exact", "kx", "anything"}) {
    EXPECT_EQ(bucketOf(*config, key), 0) << key;
    EXPECT_FALSE(config->unreadableEntry(KeyKind::Scalar, key)) << key;
  }
}

TEST_F(TBConfigTest, AFileThatCannotBeUsedGivesNoConfig) {
  EXPECT_EQ(TBConfig::init(fake_.platform), nullptr);
  fake_.fileSystem.files[std::string(kWhitelistPath)] = {};
  EXPECT_EQ(TBConfig::init(fake_.platform), nullptr);
  EXPECT_THAT(fake_.systemLog.lines,
              ElementsAre("error: Couldn't load whitelist",
                          "error: Couldn't parse the contents of the config file. Error: "
                          "line 1, column 1: no element found"));
}

}  // namespace
}  // namespace tbdaily

#include "report/tb_config.h"

#include <gmock/gmock.h>

#include "report/internal_device.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;

PlistValue dict(PlistDictionary entries = {}) {
  return PlistValue::dictionary(std::move(entries));
}
PlistValue bucket(std::int64_t n) {
  return dict({{"bucket_interval", PlistValue::int64(n)}});
}

class TBConfigTest : public ::testing::Test {
 protected:
  TBConfigTest() { gInternalDeviceAnswer.once.reset(); }

  std::unique_ptr<TBConfig> load(const PlistDictionary& groups) {
    fake_.putPlist(kWhitelistPath, groups);
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
  const auto config = load(
      {{"A",
        dict({{"ScalarKeys", dict({{"net.x", dict()}, {"both", bucket(1)}})},
              {"ScalarKeyPrefixes", dict({{"net.", bucket(2)}, {"net.wifi.", bucket(3)}, {"", bucket(4)}})},
              {"Comment", PlistValue::string("passed over")}})},
       {"B", dict({{"ScalarKeys", dict({{"both", bucket(5)}})},
                   {"DistributionKeys", dict({{"dist", dict()}})},
                   {"DistributionKeyPrefixes", dict({{"d.", bucket(6)}})}})}});
  ASSERT_NE(config, nullptr);
  EXPECT_EQ(bucketOf(*config, "net.x"), 0);
  EXPECT_EQ(bucketOf(*config, "net.wifi.rssi"), 2);
  EXPECT_EQ(bucketOf(*config, "both"), 5);
  EXPECT_EQ(bucketOf(*config, "unlisted"), -1);
  EXPECT_EQ(bucketOf(*config, "dist"), -1);
  for (const char* key : {"dist", "d.x"}) EXPECT_NE(config->configOptionsForDistributionKey(key), nullptr);
  EXPECT_EQ(config->configOptionsForDistributionKey("net.x"), nullptr);
  EXPECT_EQ(config->match(KeyKind::Scalar, "both")->group, "B");
  EXPECT_THAT(fake_.systemLog.lines,
              ElementsAre("debug: prefix match net. for net.wifi.rssi", "debug: prefix match d. for d.x"));
}

TEST_F(TBConfigTest, TaskingSwitchesGroupsOffOnOrdinaryDevices) {
  const auto group = [](const char* key) { return dict({{"ScalarKeys", dict({{key, dict()}})}}); };
  const PlistDictionary groups{
      {"Off", group("off")}, {"Odd", group("odd")}, {"InternalTesting", group("internal")}};
  fake_.preferences.domains["com.velmora.da"] = {{"Off", PlistValue::boolean(false)},
                                                 {"Odd", PlistValue::int64(0)}};
  const auto ordinary = load(groups);
  EXPECT_EQ(bucketOf(*ordinary, "off"), -1);
  EXPECT_EQ(bucketOf(*ordinary, "odd"), 0);
  EXPECT_EQ(bucketOf(*ordinary, "internal"), -1);
  EXPECT_THAT(fake_.systemLog.lines, ElementsAre("default: keyGroup Off is disabled by tasking"));

  gInternalDeviceAnswer.once.reset();
  fake_.systemLog.lines.clear();
  fake_.deviceAnswers.answers.set("InternalBuild", PlistValue::boolean(true));
  const auto internal = load(groups);
  EXPECT_EQ(bucketOf(*internal, "off"), 0);
  EXPECT_EQ(bucketOf(*internal, "internal"), 0);
  EXPECT_EQ(internal->configOptionsForScalarKey("anything")->size(), 0U);
  EXPECT_THAT(fake_.systemLog.lines,
              ElementsAre("debug: passing @{} for anything as device is Velmora Internal"));
}

TEST_F(TBConfigTest, EntriesThatAreNotUnderstoodAreSkippedByNameAndTheRestLoads) {
  const PlistValue text = PlistValue::string("?");
  const auto config =
      load({{"NoGroup", text},
            {"G", dict({{"DistributionKeys", text},
                        {"ScalarKeys", dict({{"a", text},
                                             {"b", dict({{"bucket_interval", text}})},
                                             {"c", dict({{"sig_fig", PlistValue::boolean(true)}})},
                                             {"d", dict({{"intervals", PlistValue::array({text})}})},
                                             {"e", dict({{"unknown", text}})},
                                             {"f", dict({{"sig_fig", PlistValue::float64(2)}})}})}})}});
  ASSERT_NE(config, nullptr);
  for (const char* key : {"a", "b", "c", "d"}) EXPECT_EQ(bucketOf(*config, key), -1) << key;
  for (const char* key : {"e", "f"}) EXPECT_EQ(bucketOf(*config, key), 0) << key;
  const auto unreadable = [](const std::string& key) {
    return "error: options of whitelist key " + key + " in G/ScalarKeys cannot be read; the key is skipped";
  };
  EXPECT_THAT(
      fake_.systemLog.lines,
      ElementsAre("error: whitelist group NoGroup is no dictionary and is skipped",
                  "error: whitelist entry G/DistributionKeys is no dictionary and is skipped",
                  "error: options of whitelist key a in G/ScalarKeys are no dictionary; the key is skipped",
                  unreadable("b"), unreadable("c"), unreadable("d")));
}

TEST_F(TBConfigTest, AFileThatCannotBeUsedGivesNoConfig) {
  EXPECT_EQ(TBConfig::init(fake_.platform), nullptr);
  fake_.fileSystem.files[std::string(kWhitelistPath)] = {};
  EXPECT_EQ(TBConfig::init(fake_.platform), nullptr);
  EXPECT_THAT(
      fake_.systemLog.lines,
      ElementsAre("error: Couldn't load whitelist",
                  "error: Couldn't parse the contents of the config file. Error: not a property list"));
}

}  // namespace
}  // namespace tbdaily

#include "driver/device_metrics.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "storage/nand_info.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;

// A kernel whose ECC events never end, or end with an error.
struct EventKernel : testing::FakeKernel {
  int sysctlByName(std::string_view, std::span<std::byte> buffer, std::size_t& length) override {
    lengths.push_back(length);
    if (events == 0) return error;
    --events;
    for (std::size_t i = 0; i < 72; ++i) buffer[i] = static_cast<std::byte>(i);
    buffer[1] = std::byte{registers};
    length = 72;
    return 0;
  }
  int events = 0, error = 2;
  std::uint8_t registers = 3;
  std::vector<std::size_t> lengths;
};

TEST(DeviceMetrics, DiskUsageIsInMebibytesOrMinusOne) {
  testing::FakePlatform fake;
  const auto run = [&fake](const PlistValue& answer) {
    fake.deviceAnswers.answers.set("DiskUsage", answer);
    fake.analyticsClient.calls.clear();
    CollectDiskUsage(fake.platform);
    return fake.analyticsClient.calls;
  };
  const std::string total = "set com.velmora.homedeck.DiskUsageUserTotalBlocks ";
  const std::string free = "set com.velmora.homedeck.DiskUsageUserBlocksFree ";
  EXPECT_THAT(run({}), ElementsAre(total + "-1", free + "-1"));
  EXPECT_THAT(run(PlistValue::dictionary({{"TotalDiskCapacity", PlistValue::int64(1048575)},
                                          {"TotalDataAvailable", PlistValue::int64(-1)}})),
              ElementsAre(total + "0", free + "-1"));
  EXPECT_THAT(run(PlistValue::dictionary({{"TotalDataAvailable", PlistValue::int64(3 << 20)}})),
              ElementsAre(total + "-1", free + "3"));
}

TEST(DeviceMetrics, NANDInfoThatReportsAnErrorGivesOneLineAndNoScalar) {
  testing::FakePlatform fake;
  CollectNANDInfo(fake.platform);
  EXPECT_TRUE(fake.analyticsClient.calls.empty());
  ASSERT_EQ(fake.systemLog.lines.size(), 1U);
  EXPECT_TRUE(fake.systemLog.lines[0].starts_with("default: error reading nand info, error 1 with message "));
}

TEST(DeviceMetrics, AtMostTenECCEventsAreReadAndLogged) {
  testing::FakePlatform fake;
  EventKernel kernel;
  Platform platform{fake.driverRegistry,    fake.preferences,     fake.deviceAnswers,
                    fake.logSubmission,     fake.analyticsClient, fake.analyticsHistory,
                    fake.propertyListCodec, fake.stackSnapshot,   fake.usageService,
                    fake.appRegistry,       fake.localeSettings,  fake.serviceListener,
                    fake.notifications,     fake.systemLog,       kernel,
                    fake.fileSystem,        fake.dynamicLoader,   fake.messageDigest};
  const auto& logs = fake.logSubmission.structured;
  kernel.events = 100;
  CollectECCEvents(platform);
  EXPECT_EQ(kernel.events, 90);
  ASSERT_EQ(logs.size(), 10U);
  EXPECT_EQ(logs[0].first, 172);
  EXPECT_EQ(PlistValue::dictionary(logs[0].second),
            PlistValue::dictionary({{"id", PlistValue::int64(0)},
                                    {"count", PlistValue::int64(3)},
                                    {"reg0", PlistValue::int64(0x0F0E0D0C0B0A0908)},
                                    {"reg1", PlistValue::int64(0x1716151413121110)},
                                    {"reg2", PlistValue::int64(0x1F1E1D1C1B1A1918)}}));
  kernel.events = 1;
  kernel.registers = 200;
  CollectECCEvents(platform);
  EXPECT_EQ(logs.back().second.get("count").asInteger(), 200);
  EXPECT_EQ(logs.back().second.size(), 10U);
  for (const int error : {2, 16, 22}) {
    kernel.error = error;
    CollectECCEvents(platform);
  }
  EXPECT_THAT(fake.systemLog.lines,
              ElementsAre("default: Unexpected errno (22) reading ECC events from kernel"));
}

}  // namespace
}  // namespace tbdaily

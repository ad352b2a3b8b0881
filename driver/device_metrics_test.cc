#include "driver/device_metrics.h"

#include <gmock/gmock.h>

#include "platform/plist_text.h"
#include "testing/fake_platform.h"
#include "testing/json_test_support.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;

TEST(DeviceMetrics, DiskUsageIsInMebibytesOrMinusOne) {
  testing::FakePlatform fake;
  const std::tuple<PlistValue, const char*, const char*> cases[] = {
      {{}, "-1", "-1"},
      {testing::plistOf(R"({"TotalDiskCapacity": 1048575, "TotalDataAvailable": -1})"), "0", "-1"},
      {testing::plistOf(R"({"TotalDataAvailable": 3145728})"), "-1", "3"}};
  for (const auto& [answer, total, free] : cases) {
    fake.deviceAnswers.answers.set("DiskUsage", answer);
    fake.analyticsClient.calls.clear();
    CollectDiskUsage(fake.platform);
    const std::string start = "set com.velmora.homedeck.DiskUsageUser";
    EXPECT_THAT(fake.analyticsClient.calls,
                ElementsAre(start + "TotalBlocks " + total, start + "BlocksFree " + free));
  }
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
  PlistData& event = fake.kernel.sysctls["kern.next_ecc_event"];
  for (int i = 0; i < 72; ++i) event.push_back(static_cast<std::byte>(i));
  event[1] = std::byte{3};
  CollectECCEvents(fake.platform);
  EXPECT_EQ(fake.kernel.asked.size(), 10U);
  const auto& logs = fake.logSubmission.structured;
  ASSERT_EQ(logs.size(), 10U);
  EXPECT_EQ(logs[0].first, 172);
  EXPECT_EQ(plistText(PlistValue::dictionary(logs[0].second)),
            R"({"id": 0, "count": 3, "reg0": 1084818905618843912, "reg1": 1663540288323457296, )"
            R"("reg2": 2242261671028070680})");
  event[1] = std::byte{200};
  CollectECCEvents(fake.platform);
  EXPECT_EQ(logs.back().second.get("count").asInteger(), 200);
  EXPECT_EQ(logs.back().second.size(), 10U);
  event.emplace_back();  // more than the buffer takes
  CollectECCEvents(fake.platform);
  fake.kernel.sysctls.clear();  // no event is left
  CollectECCEvents(fake.platform);
  EXPECT_THAT(fake.systemLog.lines,
              ElementsAre("default: Unexpected errno (12) reading ECC events from kernel"));
}

}  // namespace
}  // namespace tbdaily

#include "driver/driver_metrics.h"

#include <gmock/gmock.h>

#include "drivermetrics/kd_report_test_support.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

using namespace kdreport::fakes;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

ScriptedDriver driverWith(std::uint64_t identifier, PlistArray channels) {
  return publishingDriver(identifier, "Driver", {legendGroup({}, {}, {}, std::move(channels))});
}

TEST(DriverMetrics, SimpleChannelsOfTheDailyCategoryBecomeScalars) {
  testing::FakePlatform fake;
  ScriptedHub hub(fake.driverRegistry);
  const kdreport::ChannelType daily = channelType(1, 1, 0x100);
  fake.driverRegistry.drivers.push_back(
      driverWith(10, {legendEntry(1, daily, "Temp"), legendEntry(2, channelType(2, 1, 0x100), "State"),
                      legendEntry(3, channelType(1, 1, 0x200), "Other category"), legendEntry(4, daily),
                      legendEntry(0x434F55, daily)}));
  fake.driverRegistry.drivers.push_back(
      driverWith(11, {legendEntry(1, daily, "Temp"), legendEntry(2, daily, "Missing")}));
  for (const auto& [driver, channel, value] :
       {std::tuple{10, 1, 42}, {10, 4, 1}, {10, 0x434F55, -7}, {11, 1, 43}})
    appendElement(hub.buffer, driver, channel, daily, {1, {value}});

  CollectDriverMetricScalars(fake.platform);
  EXPECT_THAT(fake.analyticsClient.calls,
              ElementsAre("set com.velmora.kdreport.Temp 42", "set com.velmora.kdreport.COU -7",
                          "set com.velmora.kdreport.Temp 43"));

  // A hub that fails ends the step without a word, and nothing stays open.
  fake.analyticsClient.calls.clear();
  for (KdStatus* status :
       {&hub.userClientOpenStatus, &hub.configureStatus, &hub.mapStatus, &hub.updateStatus}) {
    *status = kKdError;
    CollectDriverMetricScalars(fake.platform);
    *status = kKdSuccess;
  }
  fake.driverRegistry.drivers.resize(1);
  CollectDriverMetricScalars(fake.platform);
  EXPECT_THAT(fake.analyticsClient.calls, IsEmpty());
  EXPECT_THAT(fake.systemLog.lines, IsEmpty());
  EXPECT_EQ(fake.driverRegistry.openHandles(), 0U);
  EXPECT_EQ(fake.driverRegistry.mappings, 0);
}

}  // namespace
}  // namespace tbdaily

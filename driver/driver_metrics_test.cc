#include "driver/driver_metrics.h"

#include <gmock/gmock.h>

#include "drivermetrics/metrics_test_support.h"
#include "testing/fake_platform.h"
#include "testing/json_test_support.h"
#include "testing/scripted_hub.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// The identifier, type and perhaps name of each channel.
testing::ScriptedDriver driverWith(std::uint64_t identifier, const std::string& channels) {
  return {
      .identifier = identifier,
      .name = "Driver",
      .serviceClass = "Driver",
      .properties = testing::dictionaryOf(
          R"({"KdReportLegendPublic": true, "KdReportLegend": [{"KdReportChannels": )" + channels + "}]}"),
      .parent = {}};
}

TEST(DriverMetrics, SimpleChannelsOfTheDailyCategoryBecomeScalars) {
  testing::FakePlatform fake;
  testing::ScriptedHub hub(fake.driverRegistry);
  // One element each: simple ones of the daily category, a state of it, and a simple one of another category.
  fake.driverRegistry.drivers.push_back(
      driverWith(10, R"([[1, 4311744513, "Temp"], [2, 4311744514, "State"], [3, 4328521729, "Other category"],
              [4, 4311744513], [4411221, 4311744513]])"));
  fake.driverRegistry.drivers.push_back(
      driverWith(11, R"([[1, 4311744513, "Temp"], [2, 4311744513, "Missing"]])"));
  for (const auto& [driver, channel, value] :
       {std::tuple{10, 1, 42}, {10, 4, 1}, {10, 0x434F55, -7}, {11, 1, 43}})
    kdreport::testing::appendElement(hub.buffer, driver, channel, kdreport::testing::channelType(1, 1, 0x100),
                                     {1, {value}});

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

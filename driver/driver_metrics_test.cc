#include "driver/driver_metrics.h"

#include <gmock/gmock.h>

#include "testing/fake_platform.h"
#include "testing/scripted_hub.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr std::int64_t kOneElement = std::int64_t{1} << 32;
constexpr std::int64_t kDaily = 0x100 << 16;
constexpr std::int64_t kOther = 0x200 << 16;

// Identifier, type and, unless null, name of each channel.
using Channels = std::vector<std::tuple<std::int64_t, std::int64_t, const char*>>;

testing::ScriptedDriver driverWith(std::uint64_t identifier, const Channels& channels) {
  PlistArray entries;
  for (const auto& [channel, type, name] : channels) {
    PlistArray entry{PlistValue::int64(channel), PlistValue::int64(type)};
    if (name != nullptr) entry.push_back(PlistValue::string(name));
    entries.push_back(PlistValue::array(entry));
  }
  const PlistValue group = PlistValue::dictionary({{"KdReportChannels", PlistValue::array(entries)}});
  return {.identifier = identifier,
          .name = "Driver",
          .serviceClass = "Driver",
          .properties = {{"KdReportLegendPublic", PlistValue::boolean(true)},
                         {"KdReportLegend", PlistValue::array({group})}},
          .parent = {}};
}

TEST(DriverMetrics, SimpleChannelsOfTheDailyCategoryBecomeScalars) {
  testing::FakePlatform fake;
  testing::ScriptedHub hub(fake.driverRegistry);
  const std::int64_t simple = kOneElement | kDaily | 1;
  const auto element = [&](std::uint64_t driver, std::uint64_t channel, std::int64_t value) {
    for (const std::uint64_t word : {driver, channel, static_cast<std::uint64_t>(simple), std::uint64_t{1},
                                     static_cast<std::uint64_t>(value)})
      for (unsigned shift = 0; shift < 64; shift += 8)
        hub.buffer.push_back(static_cast<std::byte>(word >> shift));
    hub.buffer.resize(hub.buffer.size() + 24);
  };
  fake.driverRegistry.drivers.push_back(driverWith(10, {{1, simple, "Temp"},
                                                        {2, kOneElement | kDaily | 2, "State"},
                                                        {3, kOneElement | kOther | 1, "Other category"},
                                                        {4, simple, nullptr},
                                                        {0x434F55, simple, nullptr}}));
  fake.driverRegistry.drivers.push_back(driverWith(11, {{1, simple, "Temp"}, {2, simple, "Missing"}}));
  element(10, 1, 42);
  element(10, 4, 1);
  element(10, 0x434F55, -7);
  element(11, 1, 43);

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

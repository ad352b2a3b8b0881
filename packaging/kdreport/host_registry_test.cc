// Two subscriptions of the host's registry in two threads: what races shows under the thread sanitizer.

#include "platform/linux/live/host_registry.h"

#include <gmock/gmock.h>

#include <fstream>
#include <thread>

#include "drivermetrics/kd_report.h"
#include "testing/temporary_folder.h"

namespace kdreport {
namespace {

constexpr std::string_view kRegistry =
    R"(<plist><dict><key>entries</key><array><dict><key>id</key><integer>1</integer><key>name</key><string>Hub</string>
<key>class</key><string>KdReportHub</string><key>client</key><dict><key>kind</key><string>hub</string></dict></dict>
<dict><key>id</key><integer>2</integer><key>name</key><string>D</string><key>properties</key><dict>
<key>KdReportLegendPublic</key><true/><key>KdReportLegend</key><array><dict><key>KdReportChannels</key><array><array>
<integer>65</integer><integer>4294967297</integer></array></array></dict></array></dict></dict></array></dict></plist>)";
constexpr std::string_view kHub =
    R"(<plist><dict><key>channels</key><array><dict><key>driver</key><integer>2</integer><key>channel</key>
<integer>65</integer><key>type</key><integer>4294967297</integer><key>elements</key><array><dict><key>words</key>
<array><integer>42</integer></array></dict></array></dict></array></dict></plist>)";

TEST(HostRegistry, ServesSubscriptionsInSeveralThreads) {
  const tbdaily::testing::TemporaryFolder device;
  const auto recordings = device.path() / "System/Device";
  std::filesystem::create_directories(recordings);
  std::ofstream(recordings / "registry.plist") << kRegistry;
  std::ofstream(recordings / "hub.plist") << kHub;
  const auto registry = openHostRegistry(device.path().native());
  const auto sampleAgainAndAgain = [&registry] {
    for (int round = 0; round < 10; ++round) {
      const auto channels = KdReportCopyAllChannels(*registry, kKdReportFlat);
      KdReportCollection subscribed;
      const auto subscription =
          KdReportCreateSubscription(*registry, nullptr, channels.get(), &subscribed, 0);
      const auto samples = KdReportCreateSamples(subscription.get(), subscribed.get());
      std::int64_t value = 0;
      KdReportIterate(samples.get(), [&value](ChannelRecord& channel) -> std::uint32_t {
        value = KdReportSimpleGetIntegerValue(&channel);
        return kKdReportKeep;
      });
      EXPECT_EQ(value, 42);
    }
  };
  const std::jthread other(sampleAgainAndAgain);
  sampleAgainAndAgain();
}

}  // namespace
}  // namespace kdreport

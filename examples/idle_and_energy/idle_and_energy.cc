// Prints how one second of this machine was spent in the idle states of each processor, and the energy that
// it took.

#include <kdreport/host_registry.h>
#include <kdreport/kd_report.h>

#include <chrono>
#include <iostream>
#include <thread>

using namespace kdreport;

constexpr std::int64_t kMicrojoules = 0x0300'0079'0000'0000;

std::uint32_t print(ChannelRecord& channel) {
  std::cout << KdReportChannelGetChannelName(&channel).value_or("?") << ':';
  if (KdReportChannelGetFormat(&channel) == kKdReportSimple)
    std::cout << ' ' << KdReportSimpleGetIntegerValue(&channel) << " uJ";
  const std::vector<double> shares = KdReportStateCopyDutyCycles(&channel);
  for (std::int32_t state = 0; state < std::int32_t(shares.size()); ++state)
    std::cout << ' ' << KdReportStateGetNameForIndex(&channel, state).value_or("?") << ' '
              << KdReportStateGetResidency(&channel, state) / 1000 << " ms";
  std::cout << '\n';
  return kKdReportKeep;
}

int main() {
  const auto registry = openHostRegistry();
  const auto channels = KdReportCopyChannelsInGroup(*registry, "idle", {}, kKdReportFlat);
  const auto energy = KdReportCopyChannelsWithUnit(*registry, kMicrojoules, kKdReportFlat);
  if (channels == nullptr) return 1;
  if (energy != nullptr && KdReportMergeChannels(channels.get(), energy.get()) % 2 != 0) return 1;
  KdReportCollection subscribed;
  const auto subscription = KdReportCreateSubscription(*registry, nullptr, channels.get(), &subscribed, 0);
  const auto before = KdReportCreateSamples(subscription.get(), subscribed.get());
  std::this_thread::sleep_for(std::chrono::seconds(1));
  const auto after = KdReportCreateSamples(subscription.get(), subscribed.get());
  const auto second = KdReportCreateSamplesDelta(before.get(), after.get());
  if (second == nullptr) return 1;  // a machine without idle states, as some virtual ones are
  KdReportIterate(second.get(), print);
}

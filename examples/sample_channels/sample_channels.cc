// Prints the value of every simple channel that the drivers of the device under TBDAILY_ROOT publish.

#include <drivermetrics/kd_report.h>
#include <platform/linux/replay/host_registry.h>

#include <iostream>

using namespace kdreport;

namespace {

std::optional<ReportError> error;

int fail() {
  std::cerr << "sample_channels: " << error->reason << " (status " << error->code << ")\n";
  return 1;
}

std::uint32_t print(ChannelRecord& channel) {
  std::cout << KdReportChannelGetDriverName(&channel).value_or("?") << ' '
            << KdReportChannelGetChannelName(&channel).value_or("?") << " = "
            << KdReportSimpleGetIntegerValue(&channel) << ' '
            << KdReportChannelGetUnitLabel(&channel).value_or("") << '\n';
  return kKdReportKeep;
}

}  // namespace

int main() {
  const auto registry = openHostRegistry();
  const auto channels = KdReportCopyChannelsOfFormat(*registry, kKdReportSimple, kKdReportFlat, &error);
  if (channels == nullptr) return fail();
  KdReportCollection subscribed;
  const auto subscription =
      KdReportCreateSubscription(*registry, nullptr, channels.get(), &subscribed, 0, &error);
  if (subscription == nullptr) return fail();
  const auto samples = KdReportCreateSamples(subscription.get(), subscribed.get(), &error);
  if (samples == nullptr) return fail();
  KdReportIterate(samples.get(), print);
}

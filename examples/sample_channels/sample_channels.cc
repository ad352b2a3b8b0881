// Prints the value of every simple channel that the drivers of the device under TBDAILY_ROOT publish.

#include <kdreport/host_registry.h>
#include <kdreport/kd_report.h>

#include <iostream>

using namespace kdreport;

namespace {

std::optional<ReportError> error;

int fail() {
  std::cerr << "sample_channels: "
            << (KdReportErrorHasReason(*error) ? error->reason : KdReportCopyStatusText(error->code)) << '\n';
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
  if (channels == nullptr && error->code == kKdNotFound) {
    std::cerr << "sample_channels: no drivers here; make a device with \"tallyctl --root DIR init\" and set "
                 "TBDAILY_ROOT=DIR\n";
    return 1;
  }
  if (channels == nullptr) return fail();
  KdReportCollection subscribed;
  const auto subscription =
      KdReportCreateSubscription(*registry, nullptr, channels.get(), &subscribed, 0, &error);
  if (subscription == nullptr) return fail();
  const auto samples = KdReportCreateSamples(subscription.get(), subscribed.get(), &error);
  if (samples == nullptr) return fail();
  KdReportIterate(samples.get(), print);
}

#include "driver/driver_metrics.h"

#include <deque>
#include <string>
#include <vector>

#include "drivermetrics/kd_report.h"
#include "platform/analytics_client.h"

namespace tbdaily {

using namespace kdreport;

namespace {

constexpr std::int32_t kDailyCategory = 0x100;
constexpr std::string_view kKeyPrefix = "com.velmora.kdreport.";

std::uint32_t KeepSimpleChannel(ChannelRecord& channel) {
  return KdReportChannelGetFormat(&channel) == kKdReportSimple ? kKdReportKeep : kKdReportRemove;
}

// The keys of sampled channels, with their values.
struct DriverMetricScalars {
  std::deque<std::string> keys;  // where they stay while others are added
  std::vector<ScalarFigure> figures;

  std::uint32_t add(const ChannelRecord& channel) {
    const auto name = KdReportChannelGetChannelName(&channel);
    if (KdReportChannelGetFormat(&channel) != kKdReportSimple || !name) return kKdReportKeep;
    std::string& key = keys.emplace_back(kKeyPrefix);
    figures.push_back({key.append(*name), KdReportSimpleGetIntegerValue(&channel)});
    return kKdReportKeep;
  }
};

}  // namespace

void CollectDriverMetricScalars(Platform& platform) {
  DriverRegistry& registry = platform.driverRegistry;
  const KdReportCollection channels =
      KdReportCopyChannelsInCategories(registry, kDailyCategory, kKdReportFileByDriver);
  if (channels == nullptr) return;
  KdReportPrune(channels.get(), KeepSimpleChannel);

  KdReportCollection subscribed;
  const auto subscription = KdReportCreateSubscription(registry, nullptr, channels.get(), &subscribed, 0);
  if (subscription == nullptr) return;
  const KdReportCollection samples = KdReportCreateSamples(subscription.get(), subscribed.get());
  DriverMetricScalars scalars;
  KdReportIterate(samples.get(), [&scalars](ChannelRecord& channel) { return scalars.add(channel); });
  platform.analyticsClient.setValuesForScalarKeys(scalars.figures);
}

}  // namespace tbdaily

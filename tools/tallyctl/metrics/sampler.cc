#include "tools/tallyctl/metrics/sampler.h"

#include <array>
#include <cstdio>

#include "tools/tallyctl/tool.h"

namespace tbdaily {

using namespace kdreport;

namespace {

std::string statusText(KdStatus status) {
  std::array<char, 16> code;
  std::snprintf(code.data(), code.size(), "0x%08x", static_cast<unsigned>(status));
  return code.data();
}

// What the device lacks for metrics, as advice; empty when it has all.
std::string_view whatIsMissing(DriverRegistry& registry) {
  const PlistValue hub = registry.KdServiceMatching("KdReportHub");
  if (hub.isNone()) {
    return "; this device has no driver registry: record System/Device/registry.plist, or make a sample "
           "device with tallyctl init";
  }
  const DriverHandle service(registry, registry.KdServiceGetMatchingService(hub));
  if (service.get() == 0) {
    return "; this device has no metrics hub: registry.plist needs an entry of the class KdReportHub with a "
           "client of the kind hub";
  }
  return {};
}

}  // namespace

void failMetrics(Tool& tool, std::string_view what, const std::optional<ReportError>& error) {
  if (!tool.hasReadAll()) return;  // which is why
  std::string line(what);
  if (error) {
    if (KdReportErrorHasReason(*error)) line += ": " + error->reason;
    line += " (" + statusText(error->code) + ")";
    // What the library answers where the registry or the hub itself is not there.
    if (error->code == kKdNotFound || error->code == kKdNoMemory)
      line += whatIsMissing(tool.platform().services().driverRegistry);
  }
  tool.fail(line);
}

ChannelSampler::ChannelSampler(Tool& tool, const ChannelCollection& channels) : tool_(tool) {
  std::optional<ReportError> error;
  subscription_ = KdReportCreateSubscription(tool.platform().services().driverRegistry, nullptr, &channels,
                                             &subscribed_, 0, &error);
  if (!subscription_) failMetrics(tool, "the channels cannot be subscribed to", error);
}

KdReportCollection ChannelSampler::sample() {
  std::optional<ReportError> error;
  KdReportCollection samples = KdReportCreateSamples(subscription_.get(), subscribed_.get(), &error);
  if (!samples) failMetrics(tool_, "the channels cannot be sampled", error);
  return tool_.hasReadAll() ? std::move(samples) : nullptr;
}

}  // namespace tbdaily

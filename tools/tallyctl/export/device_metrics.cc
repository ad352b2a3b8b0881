// The metrics of a device's state.

#include "driver/device_metrics.h"

#include "driver/daily_tasks.h"
#include "platform/calendar.h"
#include "platform/diagnostics.h"
#include "platform/platform.h"
#include "platform/preferences_store.h"
#include "storage/nand_info.h"
#include "storage/storage_connection.h"
#include "storage/write_amplification.h"
#include "tools/tallyctl/controller_buffer.h"
#include "tools/tallyctl/export/exposition.h"
#include "tools/tallyctl/export/textfile.h"
#include "tools/tallyctl/metrics/sampler.h"
#include "tools/tallyctl/metrics/values.h"
#include "tools/tallyctl/spool_contents.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

using namespace kdreport;

namespace {

constexpr MetricDescription kLastDay{"tbdaily_last_processed_day_timestamp_seconds", "gauge",
                                     "Begin of the last day that was processed."};
constexpr MetricDescription kPending{"tbdaily_pending_logs", "gauge", "Logs that wait for submission."};
constexpr MetricDescription kNand{"tbdaily_nand", "gauge",
                                  "Figure of the storage controller at this moment, by its key."};
constexpr MetricDescription kAmplification{"tbdaily_write_amplification_ratio", "gauge",
                                           "What the flash erased for each unit that the host wrote."};
constexpr MetricDescription kDriverValue{
    "tbdaily_driver_value", "gauge", "Value of a driver's channel at this moment, in the channel's unit."};

void appendLastDay(std::string& text, PreferencesStore& preferences) {
  bool isThere = false;
  const std::int64_t day = preferences.getInteger(kLastProcessedDay, preference_domain::kJob, &isThere);
  if (isThere) Metric(text, kLastDay).add({}, dateOf(static_cast<DayNumber>(day)).unixSeconds());
}

void appendPending(std::string& text, Tool& tool) {
  const auto spool = readSpool(tool.platform().host(), tool.platform().services().propertyListCodec);
  if (!spool) return tool.fail(spool.reason());
  for (const SpoolPart& part : spool->parts) {
    if (part.name == "pending") Metric(text, kPending).add({}, static_cast<std::int64_t>(part.logs.size()));
  }
}

void appendStorage(std::string& text, Platform& platform) {
  QuietDiagnostics quiet;
  Platform services = platformWith(platform, quiet);
  const PlistDictionary info = currentNANDInfo(services);
  Metric metric(text, kNand);
  for (const auto& [key, value] : info) {
    const auto number = value.asNumber();
    if (!number) continue;
    number->isReal() ? metric.add({{"key", key}}, number->toDouble())
                     : metric.add({{"key", key}}, number->toInt64());
  }
  const FetchedStats stats(services.driverRegistry, quiet);
  if (!stats) return;
  const WriteAmplification amplification = computeWriteAmplification(stats.context());
  Metric ratio(text, kAmplification);
  ratio.add({{"kind", "user"}}, amplification.user);
  ratio.add({{"kind", "system"}}, amplification.system);
}

// A registry, or drivers, that are not there have no channels; none otherwise means that it was said why.
KdReportCollection simpleChannels(Tool& tool) {
  std::optional<ReportError> error;
  KdReportCollection channels = KdReportCopyAllChannels(tool.platform().services().driverRegistry,
                                                        kKdReportFileByDriver | kKdReportFileByGroup, &error);
  if (!tool.hasReadAll()) return nullptr;
  if (!channels) {
    if (error && error->code != kKdNotFound && error->code != kKdNoMemory)
      failMetrics(tool, "the channels cannot be had", error);
    return nullptr;
  }
  KdReportPrune(channels.get(), [](ChannelRecord& channel) {
    return KdReportChannelGetFormat(&channel) == kKdReportSimple ? kKdReportKeep : kKdReportRemove;
  });
  return KdReportGetChannelCount(channels.get()) != 0 ? std::move(channels) : nullptr;
}

void appendDriverValues(std::string& text, Tool& tool) {
  const KdReportCollection channels = simpleChannels(tool);
  if (!channels) return;
  ChannelSampler sampler(tool, *channels);
  if (!sampler) return;
  const KdReportCollection samples = sampler.sample();
  if (!samples) return;
  const auto values = readChannels(samples.get(), ChannelContents::Values);
  if (!values) return failMetrics(tool, "the channels cannot be read", std::nullopt);
  Metric metric(text, kDriverValue);
  for (const ChannelValues& channel : *values) {
    if (channel.format != kKdReportSimple || channel.value == kKdReportInvalid) continue;
    metric.add({{"driver", channel.driver.value_or("")},
                {"group", channel.group.value_or("")},
                {"subgroup", channel.subGroup.value_or("")},
                {"channel", channel.name.value_or("")},
                {"unit", channel.unitLabel.value_or("")}},
               channel.value);
  }
}

}  // namespace

void appendDeviceMetrics(std::string& text, Tool& tool) {
  Platform& platform = tool.platform().services();
  appendLastDay(text, platform.preferences);
  appendPending(text, tool);
  appendStorage(text, platform);
  appendDriverValues(text, tool);
  tool.hasReadAll();
}

}  // namespace tbdaily

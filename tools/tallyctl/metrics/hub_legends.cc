#include "tools/tallyctl/metrics/hub_legends.h"

#include "drivermetrics/kd_report.h"

namespace tbdaily {

using namespace kdreport;

std::optional<std::int64_t> ChannelMeaning::unit() const {
  const PlistDictionary* info = info_.asDictionary();
  const auto recorded = info != nullptr ? info->get(kd_report_key::kChannelUnit).asInteger() : std::nullopt;
  if (!recorded || *recorded == kKdReportInvalid) return std::nullopt;
  return recorded;
}

std::optional<std::uint8_t> ChannelMeaning::quantity() const {
  const auto code = unit();
  return code ? std::optional(KdReportUnitGetQuantity(*code)) : std::nullopt;
}

std::optional<std::uint64_t> ChannelMeaning::unitsIn(std::uint64_t seconds) const {
  std::uint64_t numerator = 0, denominator = 0;
  if (quantity() != kKdReportTime || KdReportUnitGetScale(*unit(), numerator, denominator) != kKdSuccess ||
      numerator == 0)
    return std::nullopt;
  return seconds * denominator / numerator;
}

std::vector<std::int64_t> ChannelMeaning::bucketBounds(std::size_t buckets) const {
  const PlistDictionary* info = info_.asDictionary();
  const PlistValue config = info != nullptr ? info->get(kd_report_key::kChannelConfig) : PlistValue();
  const auto bytes = config.asData().value_or(std::span<const std::byte>());
  return KdReportCopyBucketBounds(bytes, buckets).value_or(std::vector<std::int64_t>());
}

HubLegends::HubLegends(const PlistValue& registryRoot) {
  if (registryRoot.asDictionary() == nullptr) return;
  const PlistValue entries = registryRoot.asDictionary()->get("entries");
  if (entries.asArray() == nullptr) return;
  for (const PlistValue& element : *entries.asArray()) {
    const PlistDictionary* entry = element.asDictionary();
    if (entry == nullptr) continue;
    const auto driver = entry->get("id").asInteger();
    const PlistValue properties = entry->get("properties");
    if (!driver || properties.asDictionary() == nullptr) continue;
    const PlistValue legend = properties.asDictionary()->get(kd_report_key::kLegend);
    if (legend.asArray() != nullptr) addLegend(*driver, *legend.asArray());
  }
}

void HubLegends::addLegend(std::int64_t driver, const PlistArray& groups) {
  for (const PlistValue& element : groups) {
    const PlistDictionary* group = element.asDictionary();
    if (group == nullptr) continue;
    const PlistValue channels = group->get(kd_report_key::kChannels);
    const PlistValue info = group->get(kd_report_key::kChannelInfo);
    if (channels.asArray() == nullptr) continue;
    for (const PlistValue& channel : *channels.asArray()) {
      const PlistArray* entry = channel.asArray();
      if (entry == nullptr || entry->empty()) continue;
      if (const auto identifier = entry->front().asInteger())
        channelInfos_.emplace(std::pair(driver, *identifier), info);
    }
  }
}

ChannelMeaning HubLegends::meaningOf(std::int64_t driver, std::int64_t channel) const {
  const auto found = channelInfos_.find({driver, channel});
  return found != channelInfos_.end() ? ChannelMeaning(found->second) : ChannelMeaning();
}

}  // namespace tbdaily

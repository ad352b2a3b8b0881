#include "tools/tallyctl/hub_legends.h"

#include "drivermetrics/channel_record.h"
#include "platform/byte_reader.h"

namespace tbdaily {

namespace {

constexpr std::uint8_t kTime = 1;
constexpr std::size_t kSegmentSize = 16;

// value * 10^exponent or value * 2^exponent, wrapping.
std::uint64_t scaled(std::uint64_t value, std::uint64_t base, unsigned exponent) {
  for (; exponent > 0; --exponent) value *= base;
  return value;
}

// A scale's exponent is biased; 0 is none.
void applyExponent(unsigned biased, std::uint64_t base, std::uint64_t& numerator,
                   std::uint64_t& denominator) {
  constexpr unsigned kBias = 127;
  if (biased == 0) return;
  if (biased > kBias)
    numerator = scaled(numerator, base, biased - kBias);
  else
    denominator = scaled(denominator, base, kBias - biased);
}

}  // namespace

std::optional<std::uint64_t> ChannelMeaning::unit() const {
  const PlistDictionary* info = info_.asDictionary();
  const auto recorded = info != nullptr ? info->get(kd_report_key::kChannelUnit).asInteger() : std::nullopt;
  if (!recorded || *recorded == kKdReportInvalid) return std::nullopt;
  return static_cast<std::uint64_t>(*recorded);
}

std::optional<std::uint8_t> ChannelMeaning::quantity() const {
  const auto code = unit();
  return code ? std::optional(static_cast<std::uint8_t>(*code >> 56)) : std::nullopt;
}

std::optional<std::uint64_t> ChannelMeaning::unitsIn(std::uint64_t seconds) const {
  const std::uint64_t scale = unit().value_or(0);
  const auto byte = [scale](unsigned shift) { return static_cast<unsigned>(scale >> shift & 0xFF); };
  if (quantity() != kTime || byte(48) != 0) return std::nullopt;
  const std::uint64_t factor = (scale & 0x7FFF'FFFF) != 0 ? scale & 0x7FFF'FFFF : 1;
  const bool divides = (scale & 0x8000'0000) != 0;
  std::uint64_t numerator = divides ? 1 : factor, denominator = divides ? factor : 1;
  applyExponent(byte(32), 10, numerator, denominator);
  applyExponent(byte(40), 2, numerator, denominator);
  return numerator != 0 ? std::optional(seconds * denominator / numerator) : std::nullopt;
}

std::vector<std::int64_t> ChannelMeaning::bucketBounds(std::size_t buckets) const {
  const PlistDictionary* info = info_.asDictionary();
  const PlistValue config = info != nullptr ? info->get(kd_report_key::kChannelConfig) : PlistValue();
  const auto bytes = config.asData().value_or(std::span<const std::byte>());
  const ByteReader segments(bytes);
  std::vector<std::int64_t> bounds;
  for (std::size_t at = 0; at + kSegmentSize <= bytes.size(); at += kSegmentSize) {
    const std::uint32_t base = *segments.at<std::uint32_t>(at);
    const bool isExponential = *segments.at<std::uint32_t>(at + 4) != 0;
    const auto count = static_cast<std::int32_t>(*segments.at<std::uint32_t>(at + 12));
    std::uint64_t upper = isExponential ? 1 : 0;
    for (std::int32_t bucket = 0; bucket < count; ++bucket) {
      upper = isExponential ? upper * base : static_cast<std::uint32_t>(upper + base);
      const auto bound = static_cast<std::int64_t>(upper);
      if (bound <= (bounds.empty() ? 0 : bounds.back()) || bounds.size() == buckets) return {};
      bounds.push_back(bound);
    }
  }
  return bounds;
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

#include "drivermetrics/channel_record.h"

namespace tbdaily {

namespace {

// The place of the legend entry, or none.
PlistValue legendValue(const ChannelRecord* channel, std::size_t place) {
  if (channel == nullptr || channel->legendChannel == nullptr) return {};
  return place < channel->legendChannel->size() ? (*channel->legendChannel)[place] : PlistValue();
}

PlistValue infoValue(const ChannelRecord* channel, std::string_view key) {
  const PlistDictionary* info = channel != nullptr ? channel->channelInfo.asDictionary() : nullptr;
  return info != nullptr ? info->get(key) : PlistValue();
}

std::optional<std::string_view> stringOf(const ChannelRecord* channel,
                                         const PlistValue ChannelRecord::*value) {
  return channel != nullptr ? (channel->*value).asString() : std::nullopt;
}

bool isPrintable(unsigned byte) {
  return byte >= 0x20 && byte <= 0x7E;
}

}  // namespace

std::int64_t integerOrInvalid(const PlistValue& value) {
  const auto number = value.asNumber();
  return number ? number->toInt64() : kKdReportInvalid;
}

KdStatus getChannelType(const ChannelRecord* channel, ChannelType& type) {
  const auto number = legendValue(channel, kLegendChannelType).asNumber();
  if (!number) return kKdError;
  type.bits = static_cast<std::uint64_t>(number->toInt64());
  return kKdSuccess;
}

KdStatus setChannelType(ChannelRecord* channel, ChannelType type) {
  if (channel == nullptr || channel->legendChannel == nullptr) return kKdError;
  PlistArray& entry = *channel->legendChannel;
  if (entry.size() < kLegendChannelType) return kKdError;
  if (entry.size() == kLegendChannelType) entry.emplace_back();
  entry[kLegendChannelType] = PlistValue::int64(static_cast<std::int64_t>(type.bits));
  return kKdSuccess;
}

std::optional<std::span<const std::byte>> getChannelConfig(const ChannelRecord* channel) {
  const PlistDictionary* info = channel != nullptr ? channel->channelInfo.asDictionary() : nullptr;
  const PlistValue* config = info != nullptr ? info->find(kd_report_key::kChannelConfig) : nullptr;
  return config != nullptr ? config->asData() : std::nullopt;
}

std::optional<std::string> _copyPrintableIDString(std::int64_t identifier) {
  std::string text;
  for (unsigned shift = 64; shift > 0; shift -= 8) {
    const auto byte = static_cast<unsigned>(static_cast<std::uint64_t>(identifier) >> (shift - 8) & 0xFF);
    if (byte == 0) continue;
    if (!isPrintable(byte)) return std::nullopt;
    text += static_cast<char>(byte);
  }
  if (text.empty()) return std::nullopt;
  return text;
}

std::int64_t KdReportChannelGetDriverID(const ChannelRecord* channel) {
  return channel != nullptr ? integerOrInvalid(channel->driverID) : kKdReportInvalid;
}

std::int64_t KdReportChannelGetChannelID(const ChannelRecord* channel) {
  return integerOrInvalid(legendValue(channel, kLegendChannelID));
}

std::uint8_t KdReportChannelGetFormat(const ChannelRecord* channel) {
  ChannelType type;
  return getChannelType(channel, type) == kKdSuccess ? type.format() : std::uint8_t{kKdReportUnknownFormat};
}

std::uint16_t KdReportChannelGetCategories(const ChannelRecord* channel) {
  ChannelType type;
  return getChannelType(channel, type) == kKdSuccess ? type.categories() : kKdReportAllCategories;
}

std::optional<std::string_view> KdReportChannelGetGroup(const ChannelRecord* channel) {
  return stringOf(channel, &ChannelRecord::groupName);
}

std::optional<std::string_view> KdReportChannelGetSubGroup(const ChannelRecord* channel) {
  return stringOf(channel, &ChannelRecord::subGroupName);
}

std::optional<std::string_view> KdReportChannelGetDriverName(const ChannelRecord* channel) {
  return stringOf(channel, &ChannelRecord::driverName);
}

std::int64_t KdReportChannelGetUnit(const ChannelRecord* channel) {
  return integerOrInvalid(infoValue(channel, kd_report_key::kChannelUnit));
}

std::optional<std::string_view> KdReportChannelGetChannelName(ChannelRecord* channel) {
  if (channel == nullptr) return std::nullopt;
  if (channel->channelName.isNone()) {
    channel->channelName = legendValue(channel, kLegendChannelName);
    if (!channel->channelName.asString()) {
      const auto text = _copyPrintableIDString(KdReportChannelGetChannelID(channel));
      channel->channelName = text ? PlistValue::string(*text) : PlistValue();
    }
  }
  return channel->channelName.asString();
}

}  // namespace tbdaily

#include "drivermetrics/channel_record.h"

#include <algorithm>

namespace tbdaily {

namespace {

// A number of the legend entry, or none.
std::optional<PlistNumber> legendNumber(const ChannelRecord* channel, PlistValue LegendEntry::*place) {
  if (channel == nullptr || !channel->source->legendChannel) return std::nullopt;
  return ((*channel->source->legendChannel).*place).asNumber();
}

PlistValue infoValue(const ChannelRecord* channel, std::string_view key) {
  const PlistDictionary* info = channel != nullptr ? channel->group().channelInfo.asDictionary() : nullptr;
  return info != nullptr ? info->get(key) : PlistValue();
}

std::optional<std::string_view> stringOf(const ChannelRecord* channel, const PlistValue LegendGroup::*value) {
  return channel != nullptr ? (channel->group().*value).asString() : std::nullopt;
}

bool isPrintable(unsigned byte) {
  return byte >= 0x20 && byte <= 0x7E;
}

}  // namespace

std::int64_t integerOrInvalid(const PlistValue& value) {
  const auto number = value.asNumber();
  return number ? number->toInt64() : kKdReportInvalid;
}

ElementData::ElementData(std::span<const std::byte> bytes)
    : bytes_(std::make_shared_for_overwrite<std::byte[]>(bytes.size())), size_(bytes.size()) {
  std::ranges::copy(bytes, bytes_.get());
}

const CachedAnswers& ChannelRecord::cached() const {
  static const CachedAnswers none;
  return cached_ != nullptr ? *cached_ : none;
}

void ChannelRecord::cache(PlistValue CachedAnswers::*answer, PlistValue value) {
  auto answers = std::make_shared<CachedAnswers>(cached());
  (*answers).*answer = std::move(value);
  cached_ = std::move(answers);
}

std::optional<LegendEntry> legendEntryOf(const PlistValue& value) {
  const PlistArray* places = value.asArray();
  if (places == nullptr) return std::nullopt;
  const auto place = [places](std::size_t i) { return i < places->size() ? (*places)[i] : PlistValue(); };
  return LegendEntry{place(0), place(1), place(2)};
}

KdStatus getChannelType(const ChannelRecord* channel, ChannelType& type) {
  const auto number = legendNumber(channel, &LegendEntry::channelType);
  if (!number) return kKdError;
  type.bits = static_cast<std::uint64_t>(number->toInt64());
  return kKdSuccess;
}

KdStatus setChannelType(ChannelRecord* channel, ChannelType type) {
  if (channel == nullptr || !channel->source->legendChannel) return kKdError;
  channel->source->legendChannel->channelType = PlistValue::int64(static_cast<std::int64_t>(type.bits));
  return kKdSuccess;
}

std::optional<std::span<const std::byte>> getChannelConfig(const ChannelRecord* channel) {
  const PlistDictionary* info = channel != nullptr ? channel->group().channelInfo.asDictionary() : nullptr;
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
  return channel != nullptr ? integerOrInvalid(channel->group().driverID) : kKdReportInvalid;
}

std::int64_t KdReportChannelGetChannelID(const ChannelRecord* channel) {
  const auto number = legendNumber(channel, &LegendEntry::channelID);
  return number ? number->toInt64() : kKdReportInvalid;
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
  return stringOf(channel, &LegendGroup::groupName);
}

std::optional<std::string_view> KdReportChannelGetSubGroup(const ChannelRecord* channel) {
  return stringOf(channel, &LegendGroup::subGroupName);
}

std::optional<std::string_view> KdReportChannelGetDriverName(const ChannelRecord* channel) {
  return stringOf(channel, &LegendGroup::driverName);
}

std::int64_t KdReportChannelGetUnit(const ChannelRecord* channel) {
  return integerOrInvalid(infoValue(channel, kd_report_key::kChannelUnit));
}

std::optional<std::string_view> KdReportChannelGetChannelName(ChannelRecord* channel) {
  if (channel == nullptr) return std::nullopt;
  if (channel->cached().channelName.isNone()) {
    const auto& entry = channel->source->legendChannel;
    PlistValue name = entry ? entry->channelName : PlistValue();
    if (!name.asString()) {
      const auto text = _copyPrintableIDString(KdReportChannelGetChannelID(channel));
      if (!text) return std::nullopt;
      name = PlistValue::string(*text);
    }
    channel->cache(&CachedAnswers::channelName, std::move(name));
  }
  return channel->cached().channelName.asString();
}

}  // namespace tbdaily

// Reading simple and array channels, and what the other formats share.

#include "drivermetrics/values.h"

namespace kdreport {

std::uint32_t announcedElements(const ChannelRecord* channel, std::uint8_t format) {
  ChannelType type;
  if (getChannelType(channel, type) != kKdSuccess || type.format() != format) return kKdReportNoIndex;
  return type.elementCount();
}

std::optional<RawElements> announcedRawElements(const ChannelRecord* channel, std::uint8_t format) {
  const auto elements = getRawElements(channel, format);
  if (!elements || elements->count() != announcedElements(channel, format)) return std::nullopt;
  return elements;
}

std::int64_t elementWord(const ChannelRecord* channel, std::uint8_t format, std::int32_t index,
                         std::size_t word) {
  const auto elements = announcedRawElements(channel, format);
  if (!elements || index < 0 || index >= std::int32_t{elements->count()}) return kKdReportInvalid;
  return elements->word(static_cast<std::size_t>(index), word);
}

std::int64_t KdReportSimpleGetIntegerValue(const ChannelRecord* channel, std::int64_t* unit) {
  if (unit != nullptr) *unit = KdReportChannelGetUnit(channel);
  const auto elements = getRawElements(channel, kKdReportSimple);
  if (!elements || elements->count() != 1) return kKdReportInvalid;
  return elements->word(0, simple_word::kValue);
}

std::int64_t KdReportArrayGetValueAtIndex(const ChannelRecord* channel, std::int32_t index) {
  const auto elements = getRawElements(channel, kKdReportArray);
  if (!elements || index < 0) return kKdReportInvalid;
  const auto [element, word] = std::pair(static_cast<std::size_t>(index) / kElementWords,
                                         static_cast<std::size_t>(index) % kElementWords);
  return element < elements->count() ? elements->word(element, word) : kKdReportInvalid;
}

std::uint32_t KdReportArrayGetCount(const ChannelRecord* channel) {
  const auto elements = getRawElements(channel, kKdReportArray);
  return elements ? elements->count() * std::uint32_t{kElementWords} : kKdReportNoIndex;
}

}  // namespace kdreport

// What the value accessors of the formats share.
#pragma once

#include "drivermetrics/raw_elements.h"

namespace kdreport {

// The element count that the channel's type announces; kKdReportNoIndex when it is of another format or
// cannot be read.
std::uint32_t announcedElements(const ChannelRecord* channel, std::uint8_t format);

// The elements of a channel of a format with one element for each state or bucket: as many as its type
// announces.
std::optional<RawElements> announcedRawElements(const ChannelRecord* channel, std::uint8_t format);

// A word of one of these elements, or kKdReportInvalid.
std::int64_t elementWord(const ChannelRecord* channel, std::uint8_t format, std::int32_t index,
                         std::size_t word);

}  // namespace kdreport

// What the value accessors of the formats share.
#pragma once

#include "drivermetrics/raw_elements.h"

namespace tbdaily {

// The meaning of the four value words, by format. An array uses them as they come.
namespace simple_word {
inline constexpr std::size_t kValue = 0;
}
namespace state_word {
inline constexpr std::size_t kIdentifier = 0, kTransitions = 1, kResidency = 2;
}
namespace histogram_word {
inline constexpr std::size_t kHits = 0, kMinimum = 1, kMaximum = 2, kSum = 3;
}

// The element count that the channel's type announces; kKdReportNoIndex when it is of another format or
// cannot be read.
std::uint32_t announcedElements(const ChannelRecord* channel, std::uint8_t format);

// The elements of a channel of a format with one element for each state or bucket: as many as its type
// announces.
std::optional<RawElements> announcedRawElements(const ChannelRecord* channel, std::uint8_t format);

// A word of one of these elements, or kKdReportInvalid.
std::int64_t elementWord(const ChannelRecord* channel, std::uint8_t format, std::int32_t index,
                         std::size_t word);

// The time spent in all states of a channel; not a number when there is none or one cannot be read. Who asks
// for the share of each state adds them up once.
double residencyOfAllStates(const ChannelRecord* channel);
double shareOfResidency(std::int64_t residency, double all);

}  // namespace tbdaily

// What the library reads and writes, as others see it: the keys of legends and property lists, and the
// 64-byte elements of the hub's buffer.
#pragma once

#include <cstddef>
#include <string_view>

namespace kdreport {

// The keys of a legend, of a record and of its channel information, as property lists spell them.
namespace kd_report_key {
inline constexpr std::string_view kLegend = "KdReportLegend";              // array of groups
inline constexpr std::string_view kLegendPublic = "KdReportLegendPublic";  // any value: may be listed

inline constexpr std::string_view kGroupName = "KdReportGroupName";
inline constexpr std::string_view kSubGroupName = "KdReportSubGroupName";
inline constexpr std::string_view kChannelInfo = "KdReportChannelInfo";
inline constexpr std::string_view kChannels = "KdReportChannels";

inline constexpr std::string_view kChannelUnit = "KdReportChannelUnit";
inline constexpr std::string_view kChannelConfig = "KdReportChannelConfig";

inline constexpr std::string_view kDriverID = "DriverID";
inline constexpr std::string_view kDriverName = "DriverName";
inline constexpr std::string_view kLegendChannel = "LegendChannel";
inline constexpr std::string_view kChannelName = "ChannelName";
inline constexpr std::string_view kUnitLabel = "UnitLabel";
inline constexpr std::string_view kProcessedChannelConfig = "ProcessedChannelConfig";
inline constexpr std::string_view kStateNames = "StateNames";
inline constexpr std::string_view kRawElements = "RawElements";

inline constexpr std::string_view kQueryOptions = "QueryOpts";
inline constexpr std::string_view kDrivers = "KdReportDrivers";
inline constexpr std::string_view kChannelGroups = "KdReportChannelGroups";
}  // namespace kd_report_key

// An element: who it is about, when it was updated, and four value words. All numbers are 64 bits,
// little-endian.
inline constexpr std::size_t kElementSize = 64;
inline constexpr std::size_t kElementWords = 4;

namespace element_offset {
inline constexpr std::size_t kProvider = 0;  // the driver's registry entry identifier
inline constexpr std::size_t kChannel = 8;
inline constexpr std::size_t kType = 16;   // ChannelType
inline constexpr std::size_t kStamp = 24;  // grows with each update
inline constexpr std::size_t kWords = 32;
}  // namespace element_offset

// The meaning of the value words, by format. An array uses them as they come.
namespace simple_word {
inline constexpr std::size_t kValue = 0;
}
namespace state_word {
inline constexpr std::size_t kIdentifier = 0, kTransitions = 1, kResidency = 2;
}
namespace histogram_word {
inline constexpr std::size_t kHits = 0, kMinimum = 1, kMaximum = 2, kSum = 3;
}

}  // namespace kdreport

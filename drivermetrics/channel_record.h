// The record of one channel, and what the library itself asks of it.
#pragma once

#include "drivermetrics/kd_report.h"

namespace tbdaily {

// A record is a dictionary with a fixed set of keys, held in members; an absent value is an absent key.
// Values that come from outside may be of any kind and are checked where they are read.
class ChannelRecord : public std::enable_shared_from_this<ChannelRecord> {
 public:
  PlistValue driverID;    // number: the publishing driver's registry entry identifier
  PlistValue driverName;  // string
  // [channel identifier, ChannelType, name (optional)]; null when it is missing or no array. Every copy of a
  // record refers to the same entry, so that a change of the type shows in all of them.
  std::shared_ptr<PlistArray> legendChannel;
  PlistValue groupName, subGroupName;  // strings
  PlistValue channelInfo;              // dictionary, shared by the channels of a legend group

  // Cached answers.
  PlistValue channelName, unitLabel;  // strings
  PlistValue processedChannelConfig;  // array of upper bucket bounds
  PlistValue stateNames;              // array of strings

  // Samples only: elements of 64 bytes. Null when missing or no data. Copies of a record share them until
  // they are given their own.
  std::shared_ptr<PlistData> rawElements;
};

// The keys of a record, of its channel information and of a legend, as property lists spell them.
namespace kd_report_key {
inline constexpr std::string_view kDriverID = "DriverID";
inline constexpr std::string_view kDriverName = "DriverName";
inline constexpr std::string_view kLegendChannel = "LegendChannel";
inline constexpr std::string_view kGroupName = "KdReportGroupName";
inline constexpr std::string_view kSubGroupName = "KdReportSubGroupName";
inline constexpr std::string_view kChannelInfo = "KdReportChannelInfo";
inline constexpr std::string_view kChannelName = "ChannelName";
inline constexpr std::string_view kUnitLabel = "UnitLabel";
inline constexpr std::string_view kProcessedChannelConfig = "ProcessedChannelConfig";
inline constexpr std::string_view kStateNames = "StateNames";
inline constexpr std::string_view kRawElements = "RawElements";

inline constexpr std::string_view kChannelUnit = "KdReportChannelUnit";
inline constexpr std::string_view kChannelConfig = "KdReportChannelConfig";

inline constexpr std::string_view kLegend = "KdReportLegend";
inline constexpr std::string_view kLegendPublic = "KdReportLegendPublic";
inline constexpr std::string_view kChannels = "KdReportChannels";

inline constexpr std::string_view kQueryOptions = "QueryOpts";
inline constexpr std::string_view kDrivers = "KdReportDrivers";
inline constexpr std::string_view kChannelGroups = "KdReportChannelGroups";
}  // namespace kd_report_key

// The places of a legend entry.
inline constexpr std::size_t kLegendChannelID = 0;
inline constexpr std::size_t kLegendChannelType = 1;
inline constexpr std::size_t kLegendChannelName = 2;

// A number as the library reads it; kKdReportInvalid for anything else.
std::int64_t integerOrInvalid(const PlistValue& value);

// kKdError when the legend entry is missing or too short, or its type is no number.
KdStatus getChannelType(const ChannelRecord* channel, ChannelType& type);
// Changes the legend entry, for every record that shares it. kKdError without one.
KdStatus setChannelType(ChannelRecord* channel, ChannelType type);

// The histogram bucket configuration of the channel information, borrowed; none when it has none.
std::optional<std::span<const std::byte>> getChannelConfig(const ChannelRecord* channel);

// The bytes of the identifier from the most significant on, without those that are zero; none when another is
// not printable or none is left.
std::optional<std::string> _copyPrintableIDString(std::int64_t identifier);

}  // namespace tbdaily

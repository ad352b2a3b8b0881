// The record of one channel, and what the library itself asks of it.
#pragma once

#include <utility>

#include "drivermetrics/kd_report.h"

namespace tbdaily {

// A legend entry, [identifier, ChannelType, name (optional)]: its places as they came, which may hold values
// of any kind; absent ones lie behind its end.
struct LegendEntry {
  PlistValue channelID, channelType;  // numbers
  PlistValue channelName;             // string
};

// What the channels of a legend group have in common. Never changes once a record refers to it.
struct LegendGroup {
  PlistValue driverID;                 // number: the driver's registry entry identifier
  PlistValue driverName;               // string
  PlistValue groupName, subGroupName;  // strings
  PlistValue channelInfo;              // dictionary
};

// What a driver says of a channel. Every record that was copied from another refers to the same, so that a
// change of the type shows in all of them.
struct ChannelSource {
  std::shared_ptr<const LegendGroup> group;  // never null
  std::optional<LegendEntry> legendChannel;  // none when it is missing or no array
};

// Answers that cost something, kept once they were asked for.
struct CachedAnswers {
  PlistValue channelName, unitLabel;  // strings
  PlistValue processedChannelConfig;  // array of upper bucket bounds
  PlistValue stateNames;              // array of strings
};

// The bytes of a sampled channel's elements. Copies refer to the same bytes.
class ElementData {
 public:
  ElementData() = default;
  // A copy of the bytes.
  explicit ElementData(std::span<const std::byte> bytes);
  // Bytes in memory that is shared with those of other channels.
  ElementData(std::shared_ptr<std::byte[]> bytes, std::size_t size) : bytes_(std::move(bytes)), size_(size) {}

  explicit operator bool() const { return bytes_ != nullptr; }
  std::span<std::byte> bytes() const { return {bytes_.get(), size_}; }

 private:
  std::shared_ptr<std::byte[]> bytes_;  // none: no data
  std::size_t size_ = 0;
};

// A record is a dictionary with a fixed set of keys, held in members; an absent value is an absent key.
// Values that come from outside may be of any kind and are checked where they are read. Copies are small: a
// sample of many thousand channels is made of them.
class ChannelRecord {
 public:
  explicit ChannelRecord(std::shared_ptr<ChannelSource> of) : source(std::move(of)) {}

  const LegendGroup& group() const { return *source->group; }
  const CachedAnswers& cached() const;
  // Keeps an answer for this record and the copies that are made of it from now on.
  void cache(PlistValue CachedAnswers::*answer, PlistValue value);

  std::shared_ptr<ChannelSource> source;  // never null
  ElementData rawElements;                // of samples only

 private:
  std::shared_ptr<const CachedAnswers> cached_;  // null: none yet
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

// None unless the value is an array.
std::optional<LegendEntry> legendEntryOf(const PlistValue& value);

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

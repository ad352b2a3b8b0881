#include "tools/tallyctl/metrics/selection.h"

#include <charconv>
#include <limits>

#include "tools/tallyctl/metrics/sampler.h"
#include "tools/tallyctl/metrics/values.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

using namespace kdreport;

namespace {

template <typename T>
std::optional<T> wholeNumber(std::string_view text, int base) {
  T value = 0;
  const char* end = text.data() + text.size();
  const auto [rest, error] = std::from_chars(text.data(), end, value, base);
  if (error != std::errc() || rest != end) return std::nullopt;
  return value;
}

// The low bits of a 32-bit number: as the library takes masks and formats.
template <typename T>
std::optional<T> parseLowBits(std::string_view text) {
  const auto code = parseCode(text);
  if (!code || *code > std::numeric_limits<std::uint32_t>::max()) return std::nullopt;
  return static_cast<T>(*code);
}

bool isOfDriver(const ChannelRecord& channel, std::string_view wanted,
                std::optional<std::uint64_t> wantedID) {
  const auto name = KdReportChannelGetDriverName(&channel);
  if (name && (*name == wanted || name->substr(0, name->rfind(" <id ")) == wanted)) return true;
  const std::int64_t driverID = KdReportChannelGetDriverID(&channel);
  return wantedID && driverID != kKdReportInvalid && static_cast<std::uint64_t>(driverID) == *wantedID;
}

// The conditions that need no more than the channel itself; groups are selected by the library.
class ChannelTest {
 public:
  explicit ChannelTest(const ChannelFilter& filter)
      : filter_(filter), driverID_(filter.driver ? parseCode(*filter.driver) : std::nullopt) {}

  bool operator()(ChannelRecord& channel) const {
    if (filter_.driver && !isOfDriver(channel, *filter_.driver, driverID_)) return false;
    if (filter_.categories && (KdReportChannelGetCategories(&channel) & *filter_.categories) == 0)
      return false;
    if (filter_.format && KdReportChannelGetFormat(&channel) != *filter_.format) return false;
    if (filter_.unit && KdReportChannelGetUnit(&channel) != *filter_.unit) return false;
    return !filter_.unitLabel || KdReportChannelGetUnitLabel(&channel) == *filter_.unitLabel;
  }

 private:
  const ChannelFilter& filter_;
  const std::optional<std::uint64_t> driverID_;
};

bool hasFailed(std::uint32_t walkStatus) {
  return (walkStatus & kKdReportStop) != 0;
}

bool narrow(ChannelCollection* channels, const ChannelFilter& filter, KdReportErrorOut error) {
  const ChannelTest isWanted(filter);
  if (hasFailed(KdReportPrune(channels, [&isWanted](ChannelRecord& channel) {
        return isWanted(channel) ? kKdReportKeep : kKdReportRemove;
      }))) {
    *error = ReportError{{}, kKdError, "channel pruning failed"};
    return false;
  }
  if (!filter.group && !filter.subGroup) return true;
  return !hasFailed(KdReportSelectChannelsInGroup(channels, filter.group, filter.subGroup, error));
}

}  // namespace

std::optional<std::uint64_t> parseCode(std::string_view text) {
  if (text.starts_with("0x") || text.starts_with("0X")) return wholeNumber<std::uint64_t>(text.substr(2), 16);
  if (!text.starts_with('-')) return wholeNumber<std::uint64_t>(text, 10);
  const auto negative = wholeNumber<std::int64_t>(text, 10);
  if (!negative) return std::nullopt;
  return static_cast<std::uint64_t>(*negative);
}

bool setFormat(ChannelFilter& filter, std::string_view text) {
  filter.format = formatOfName(text);
  if (!filter.format) filter.format = parseLowBits<std::uint8_t>(text);
  return filter.format.has_value();
}

bool setCategories(ChannelFilter& filter, std::string_view text) {
  filter.categories = parseLowBits<std::uint16_t>(text);
  return filter.categories.has_value();
}

void setUnit(ChannelFilter& filter, const std::string& text) {
  if (const auto code = parseCode(text)) {
    filter.unit = static_cast<std::int64_t>(*code);
  } else {
    filter.unitLabel = text;
  }
}

ChannelSelection selectChannels(Tool& tool, const ChannelFilter& filter) {
  ChannelSelection selection;
  if (!tool.hasUsableRoot()) return selection;
  std::optional<ReportError> error;
  KdReportCollection channels = KdReportCopyAllChannels(tool.platform().services().driverRegistry,
                                                        kKdReportFileByDriver | kKdReportFileByGroup, &error);
  if (!tool.hasReadAll()) return selection;
  if (channels) {
    selection.published = KdReportGetChannelCount(channels.get());
    if (narrow(channels.get(), filter, &error)) {
      selection.selected = KdReportGetChannelCount(channels.get());
      selection.channels = std::move(channels);
      return selection;
    }
  }
  failMetrics(tool, "the channels cannot be had", error);
  return {};
}

}  // namespace tbdaily

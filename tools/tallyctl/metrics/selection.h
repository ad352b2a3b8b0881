// Which channels of a device a command is about.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "drivermetrics/kd_report.h"

namespace tbdaily {

class Tool;

// A 64-bit code as the command line takes it: decimal, a negative one as its two's complement, or "0x" and
// hexadecimal digits. Nothing for another text or a number that does not fit.
std::optional<std::uint64_t> parseCode(std::string_view text);

// What is set has to hold for a channel, all of it.
struct ChannelFilter {
  std::optional<std::string> driver;  // display name, its part before the identifier, or the identifier
  std::optional<std::string> group, subGroup;
  std::optional<std::uint16_t> categories;  // any of them
  std::optional<std::uint8_t> format;
  std::optional<std::int64_t> unit;
  std::optional<std::string> unitLabel;
};

// Condition from the words of the command line; false when they make none.
bool setFormat(ChannelFilter& filter, std::string_view text);  // its name, or a number whose low 8 bits count
bool setCategories(ChannelFilter& filter, std::string_view text);  // a mask, of its low 16 bits
void setUnit(ChannelFilter& filter, const std::string& text);      // a code, else a label

struct ChannelSelection {
  kdreport::KdReportCollection
      channels;                 // filed by driver and group; null when a call failed, which is said then
  std::uint32_t published = 0;  // before the filter
  std::uint32_t selected = 0;
};

// The channels of all drivers that publish theirs, narrowed.
ChannelSelection selectChannels(Tool& tool, const ChannelFilter& filter);

}  // namespace tbdaily

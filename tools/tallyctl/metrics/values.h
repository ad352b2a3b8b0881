// The channels of a collection as plain values, read once, so that every way of printing them says the same.
#pragma once

#include <limits>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "drivermetrics/kd_report.h"

namespace tbdaily {

// Numbers that are missing are kKdReportInvalid.

struct StateValues {
  std::int64_t id = kdreport::kKdReportInvalid;
  std::optional<std::string> name;
  std::int64_t entries = kdreport::kKdReportInvalid;
  std::int64_t residency = kdreport::kKdReportInvalid;
  double dutyCycle = std::numeric_limits<double>::quiet_NaN();
};

struct BucketValues {
  std::int64_t lower = kdreport::kKdReportInvalid,
               upper = kdreport::kKdReportInvalid;  // together, or neither
  std::int64_t hits = kdreport::kKdReportInvalid;
  std::int64_t minimum = kdreport::kKdReportInvalid, maximum = kdreport::kKdReportInvalid,
               sum = kdreport::kKdReportInvalid;
};

struct ChannelValues {
  std::optional<std::string> driver, group, subGroup, name, unitLabel;
  std::int64_t driverID = kdreport::kKdReportInvalid, channelID = kdreport::kKdReportInvalid;
  std::int64_t unit = kdreport::kKdReportInvalid;
  std::uint8_t format = kdreport::kKdReportUnknownFormat;
  std::uint16_t categories = kdreport::kKdReportAllCategories;
  std::uint16_t elementCount = 0;

  // Of samples and deltas, by format.
  std::int64_t value = kdreport::kKdReportInvalid;
  std::vector<StateValues> states;
  std::uint32_t currentState = kdreport::kKdReportNoIndex;
  std::vector<BucketValues> buckets;
  std::int64_t minimum = kdreport::kKdReportInvalid,
               maximum = kdreport::kKdReportInvalid;  // over all buckets
  std::vector<std::int64_t> array;
};

// "simple" and so on; "format 9" for one that has no name.
std::string formatName(std::uint8_t format);
std::optional<std::uint8_t> formatOfName(std::string_view name);

// What a collection's channels carry.
enum class ChannelContents : std::uint8_t { Description, Values };

// In walk order; nothing when the walk fails.
std::optional<std::vector<ChannelValues>> readChannels(const kdreport::ChannelCollection* collection,
                                                       ChannelContents contents);

}  // namespace tbdaily

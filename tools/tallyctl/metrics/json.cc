#include "tools/tallyctl/metrics/json.h"

#include <array>
#include <cstdio>

namespace tbdaily {

using namespace kdreport;

namespace {

// Null for the invalid number.
std::optional<std::int64_t> number(std::int64_t value) {
  return value != kKdReportInvalid ? std::optional(value) : std::nullopt;
}

// A code as text, since readers that hold numbers as doubles round it; nothing for the invalid number.
std::optional<std::string> unitCode(std::int64_t unit) {
  if (unit == kKdReportInvalid) return std::nullopt;
  std::array<char, 24> text;
  std::snprintf(text.data(), text.size(), "0x%016llx", static_cast<unsigned long long>(unit));
  return text.data();
}

void writeStates(JsonWriter& json, const ChannelValues& channel) {
  {
    const auto states = json.array("states");
    for (const StateValues& state : channel.states) {
      const auto entry = json.object();
      json.add("id", number(state.id));
      json.add("name", state.name);
      json.add("entries", number(state.entries));
      json.add("residency", number(state.residency));
      json.add("dutyCycle", state.dutyCycle);
    }
  }
  json.add("current",
           channel.currentState != kKdReportNoIndex ? std::optional(channel.currentState) : std::nullopt);
}

void writeBuckets(JsonWriter& json, const ChannelValues& channel) {
  {
    const auto buckets = json.array("buckets");
    for (const BucketValues& bucket : channel.buckets) {
      const auto entry = json.object();
      json.add("lower", number(bucket.lower));
      json.add("upper", number(bucket.upper));
      json.add("hits", number(bucket.hits));
      json.add("minimum", number(bucket.minimum));
      json.add("maximum", number(bucket.maximum));
      json.add("sum", number(bucket.sum));
    }
  }
  json.add("minimum", number(channel.minimum));
  json.add("maximum", number(channel.maximum));
}

void writeArray(JsonWriter& json, const ChannelValues& channel) {
  const auto values = json.array("values");
  for (const std::int64_t value : channel.array) json.add(number(value));
}

void writeValues(JsonWriter& json, const ChannelValues& channel) {
  switch (channel.format) {
    case kKdReportSimple:
      json.add("value", number(channel.value));
      break;
    case kKdReportState:
      writeStates(json, channel);
      break;
    case kKdReportHistogram:
      writeBuckets(json, channel);
      break;
    case kKdReportArray:
      writeArray(json, channel);
      break;
    default:
      break;
  }
}

void writeChannel(JsonWriter& json, const ChannelValues& channel, ChannelContents contents) {
  const auto entry = json.object();
  json.add("driver", channel.driver);
  json.add("driverID", number(channel.driverID));
  json.add("group", channel.group);
  json.add("subgroup", channel.subGroup);
  json.add("name", channel.name);
  json.add("channelID", number(channel.channelID));
  json.add("format", channel.format);
  json.add("categories", channel.categories);
  json.add("elements", channel.elementCount);
  json.add("unit", number(channel.unit));
  json.add("unitCode", unitCode(channel.unit));
  json.add("unitLabel", channel.unitLabel);
  if (contents == ChannelContents::Values) writeValues(json, channel);
}

}  // namespace

void writeChannels(JsonWriter& json, const std::vector<ChannelValues>& channels, ChannelContents contents) {
  const auto root = json.array();
  for (const ChannelValues& channel : channels) writeChannel(json, channel, contents);
}

}  // namespace tbdaily

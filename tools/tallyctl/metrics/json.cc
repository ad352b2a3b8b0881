#include "tools/tallyctl/metrics/json.h"

#include "tools/tallyctl/tool.h"

namespace tbdaily {

using namespace kdreport;

namespace {

PlistValue number(std::int64_t value) {
  return value != kKdReportInvalid ? PlistValue::int64(value) : jsonNull();
}

PlistValue text(const std::optional<std::string>& value) {
  return value ? PlistValue::string(*value) : jsonNull();
}

PlistValue statesAsJson(const std::vector<StateValues>& states) {
  PlistArray array;
  array.reserve(states.size());
  for (const StateValues& state : states) {
    array.push_back(PlistValue::dictionary({{"id", number(state.id)},
                                            {"name", text(state.name)},
                                            {"entries", number(state.entries)},
                                            {"residency", number(state.residency)},
                                            {"dutyCycle", PlistValue::float64(state.dutyCycle)}}));
  }
  return PlistValue::array(std::move(array));
}

PlistValue bucketsAsJson(const std::vector<BucketValues>& buckets) {
  PlistArray array;
  array.reserve(buckets.size());
  for (const BucketValues& bucket : buckets) {
    array.push_back(PlistValue::dictionary({{"lower", number(bucket.lower)},
                                            {"upper", number(bucket.upper)},
                                            {"hits", number(bucket.hits)},
                                            {"minimum", number(bucket.minimum)},
                                            {"maximum", number(bucket.maximum)},
                                            {"sum", number(bucket.sum)}}));
  }
  return PlistValue::array(std::move(array));
}

PlistValue arrayAsJson(const std::vector<std::int64_t>& values) {
  PlistArray array;
  array.reserve(values.size());
  for (const std::int64_t value : values) array.push_back(number(value));
  return PlistValue::array(std::move(array));
}

void addValues(const ChannelValues& channel, PlistDictionary& json) {
  switch (channel.format) {
    case kKdReportSimple:
      json.set("value", number(channel.value));
      break;
    case kKdReportState:
      json.set("states", statesAsJson(channel.states));
      json.set("current", channel.currentState != kKdReportNoIndex ? PlistValue::int64(channel.currentState)
                                                                   : jsonNull());
      break;
    case kKdReportHistogram:
      json.set("buckets", bucketsAsJson(channel.buckets));
      json.set("minimum", number(channel.minimum));
      json.set("maximum", number(channel.maximum));
      break;
    case kKdReportArray:
      json.set("values", arrayAsJson(channel.array));
      break;
    default:
      break;
  }
}

}  // namespace

PlistValue channelsAsJson(const std::vector<ChannelValues>& channels, ChannelContents contents) {
  PlistArray array;
  array.reserve(channels.size());
  for (const ChannelValues& channel : channels) {
    PlistDictionary json{{"driver", text(channel.driver)},
                         {"driverID", number(channel.driverID)},
                         {"group", text(channel.group)},
                         {"subgroup", text(channel.subGroup)},
                         {"name", text(channel.name)},
                         {"channelID", number(channel.channelID)},
                         {"format", PlistValue::int64(channel.format)},
                         {"categories", PlistValue::int64(channel.categories)},
                         {"elements", PlistValue::int64(channel.elementCount)},
                         {"unit", number(channel.unit)},
                         {"unitLabel", text(channel.unitLabel)}};
    if (contents == ChannelContents::Values) addValues(channel, json);
    array.push_back(PlistValue::dictionary(std::move(json)));
  }
  return PlistValue::array(std::move(array));
}

}  // namespace tbdaily

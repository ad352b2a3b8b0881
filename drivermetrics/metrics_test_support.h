// Channels and collections as they are inside, for the tests of the library.
#pragma once

#include "drivermetrics/channel_collection.h"
#include "drivermetrics/kd_report_test_support.h"
#include "drivermetrics/raw_elements.h"

namespace kdreport::testing {

using namespace fakes;

// A record as discovery makes it, of the driver "D<driver>".
inline KdReportChannel channelOf(std::int64_t driver, std::int64_t identifier,
                                 ChannelType type = channelType(1)) {
  const LegendGroup group{
      PlistValue::int64(driver), PlistValue::string("D" + std::to_string(driver)), {}, {}, {}};
  return makeChannelRecord(
      std::make_shared<LegendGroup>(group),
      LegendEntry{
          PlistValue::int64(identifier), PlistValue::int64(static_cast<std::int64_t>(type.bits)), {}});
}

// A record without any key.
inline KdReportChannel emptyChannel() {
  return makeChannelRecord(std::make_shared<LegendGroup>(), std::nullopt);
}

// The record's group, to be changed.
inline LegendGroup& groupOf(ChannelRecord& channel) {
  auto group = std::make_shared<LegendGroup>(channel.group());
  channel.source->block->group = group;
  return *group;
}

inline KdReportCollection collectionOf(const std::vector<KdReportChannel>& channels,
                                       std::uint32_t options = kKdReportFlat) {
  KdReportCollection collection = KdReportCreateAggregate(options);
  for (const KdReportChannel& channel : channels) (void)_addChannel(collection.get(), channel, options);
  return collection;
}

inline std::vector<ChannelRecord*> channelsIn(const ChannelCollection* collection) {
  std::vector<ChannelRecord*> channels;
  KdReportIterate(collection, [&channels](ChannelRecord& channel) -> std::uint32_t {
    channels.push_back(&channel);
    return kKdReportKeep;
  });
  return channels;
}

// A channel with elements in it, as a sample holds it.
inline KdReportChannel sampled(ChannelType type, const std::vector<Element>& elements,
                               PlistDictionary info = {}) {
  KdReportChannel channel = channelOf(1, 0x4348, type);
  groupOf(*channel).channelInfo = PlistValue::dictionary(std::move(info));
  PlistData bytes;
  for (const Element& element : elements) appendElement(bytes, 1, 0x4348, type, element);
  channel->copyElements(bytes);
  return channel;
}

}  // namespace kdreport::testing

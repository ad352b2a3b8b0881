// Channels, collections and element buffers for the tests of the library.
#pragma once

#include "drivermetrics/channel_collection.h"
#include "drivermetrics/raw_elements.h"
#include "platform/byte_writer.h"
#include "testing/fake_drivers.h"

namespace kdreport::testing {

using namespace tbdaily::testing;

inline ChannelType channelType(unsigned format, unsigned elements = 1, unsigned categories = 0) {
  return {std::uint64_t{format} | std::uint64_t{categories} << 16 | std::uint64_t{elements} << 32};
}

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
  channel.source->group = group;
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

struct Element {
  std::uint64_t stamp = 0;
  std::vector<std::int64_t> words;
};

inline void appendElement(PlistData& bytes, std::int64_t driver, std::int64_t identifier, ChannelType type,
                          const Element& element = {}) {
  for (const std::uint64_t field :
       {static_cast<std::uint64_t>(driver), static_cast<std::uint64_t>(identifier), type.bits, element.stamp})
    tbdaily::appendLittleEndian(bytes, field);
  for (std::size_t i = 0; i < kElementWords; ++i)
    tbdaily::appendLittleEndian(bytes,
                                i < element.words.size() ? static_cast<std::uint64_t>(element.words[i]) : 0);
}

// A channel with elements in it, as a sample holds it.
inline KdReportChannel sampled(ChannelType type, const std::vector<Element>& elements,
                               PlistDictionary info = {}) {
  KdReportChannel channel = channelOf(1, 0x4348, type);
  groupOf(*channel).channelInfo = PlistValue::dictionary(std::move(info));
  PlistData bytes;
  for (const Element& element : elements) appendElement(bytes, 1, 0x4348, type, element);
  channel->rawElements = ElementData(bytes);
  return channel;
}

}  // namespace kdreport::testing

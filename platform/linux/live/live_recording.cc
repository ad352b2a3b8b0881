#include "platform/linux/live/live_recording.h"

#include "platform/byte_reader.h"

namespace tbdaily {

namespace {

PlistValue number(std::uint64_t value) {
  return PlistValue::int64(static_cast<std::int64_t>(value));
}

// Every channel of the legends.
std::vector<ChannelKey> channelsOf(const PlistValue& entries) {
  std::vector<ChannelKey> keys;
  for (const PlistValue& entry : *entries.asArray()) {
    const PlistValue legend = entry.get("properties").get("KdReportLegend");
    if (legend.asArray() == nullptr) continue;
    for (const PlistValue& group : *legend.asArray()) {
      const PlistValue channels = group.get("KdReportChannels");
      for (const PlistValue& channel : *channels.asArray())
        keys.push_back({static_cast<std::uint64_t>(*entry.get("id").asInteger()),
                        static_cast<std::uint64_t>(*channel.asArray()->front().asInteger())});
    }
  }
  return keys;
}

PlistValue recordedElement(const ByteReader& element) {
  constexpr std::size_t kStampAt = 24, kWordsAt = 32;
  PlistArray words;
  for (std::size_t word = 0; word < HubRoom::kWords; ++word)
    words.push_back(number(*element.at<std::uint64_t>(kWordsAt + word * sizeof(std::uint64_t))));
  return PlistValue::dictionary({{"stamp", number(*element.at<std::uint64_t>(kStampAt))},
                                 {"words", PlistValue::array(std::move(words))}});
}

PlistValue recordedChannel(const ChannelKey& key, std::span<const std::byte> elements) {
  constexpr std::size_t kTypeAt = 16;
  const std::uint64_t type = *ByteReader(elements).at<std::uint64_t>(kTypeAt);
  PlistArray recorded;
  for (; !elements.empty(); elements = elements.subspan(HubRoom::kElementBytes))
    recorded.push_back(recordedElement(ByteReader(elements.first(HubRoom::kElementBytes))));
  return PlistValue::dictionary({{"driver", number(key.driver)},
                                 {"channel", number(key.channel)},
                                 {"type", number(type)},
                                 {"elements", PlistValue::array(std::move(recorded))}});
}

PlistValue recordedEntry(const PlistValue& entry) {
  if (entry.get("client").isNone()) return entry;
  PlistDictionary hub = entry.mutableDictionary();
  hub.set("client", PlistValue::dictionary({{"kind", PlistValue::string("hub")}}));
  return PlistValue::dictionary(std::move(hub));
}

}  // namespace

LiveRecording recordLiveHost(const LiveHost& host) {
  const std::vector<ChannelKey> keys = channelsOf(host.entries());
  const std::unique_ptr<HubValues> values = host.openValues();
  const std::vector<std::size_t> elements = values->configure(keys);
  values->update();  // lays out what was found
  values->update();  // reads
  PlistArray channels;
  std::vector<std::byte> room;
  for (std::size_t i = 0; i < keys.size(); ++i) {
    room.assign(elements[i] * HubRoom::kElementBytes, std::byte{0});
    if (room.empty()) continue;
    values->write(i, HubRoom(room));
    channels.push_back(recordedChannel(keys[i], room));
  }
  PlistArray entries;
  for (const PlistValue& entry : *host.entries().asArray()) entries.push_back(recordedEntry(entry));
  return {{{"entries", PlistValue::array(std::move(entries))}},
          {{"channels", PlistValue::array(std::move(channels))}}};
}

}  // namespace tbdaily

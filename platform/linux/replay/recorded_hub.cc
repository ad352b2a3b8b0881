#include <algorithm>
#include <array>
#include <unordered_map>

#include "platform/linux/registry/entry_registry.h"
#include "platform/linux/registry/hub_client.h"
#include "platform/linux/replay/recorded_clients.h"

namespace tbdaily {

namespace {

std::uint64_t integerOrZero(const PlistDictionary& dictionary, std::string_view key) {
  const PlistValue* value = dictionary.find(key);
  return static_cast<std::uint64_t>(value != nullptr ? value->asInteger().value_or(0) : 0);
}

// The channels of hub.plist as they are now; of two with the same identifiers the first counts.
class RecordedChannels {
 public:
  explicit RecordedChannels(Recordings& recordings)
      : channels_(recordings.entry(recording::kHub, "channels")) {
    if (channels_.asArray() == nullptr) return;
    byKey_.reserve(channels_.asArray()->size());
    for (const PlistValue& element : *channels_.asArray()) {
      const PlistDictionary* channel = element.asDictionary();
      if (channel == nullptr) continue;
      const auto driverID = channel->get("driver").asInteger(),
                 channelID = channel->get("channel").asInteger();
      if (!driverID || !channelID) continue;
      byKey_.emplace(
          ChannelKey{static_cast<std::uint64_t>(*driverID), static_cast<std::uint64_t>(*channelID)}, channel);
    }
  }

  // Null when it is not there. Borrowed from this object.
  const PlistDictionary* find(const ChannelKey& key) const {
    const auto found = byKey_.find(key);
    return found != byKey_.end() ? found->second : nullptr;
  }

 private:
  PlistValue channels_;
  std::unordered_map<ChannelKey, const PlistDictionary*, ChannelKeyHash> byKey_;
};

// The elements of a channel; null when it has none.
const PlistArray* elementsOf(const PlistDictionary* channel) {
  const PlistValue* elements = channel != nullptr ? channel->find("elements") : nullptr;
  return elements != nullptr ? elements->asArray() : nullptr;
}

// The values of hub.plist, as they stand at each update. What vanishes from it keeps its values; what it has
// beyond the layout is left out.
class RecordedHub : public HubValues {
 public:
  explicit RecordedHub(Recordings& recordings) : recordings_(recordings) {}

  std::vector<std::size_t> configure(std::span<const ChannelKey> interests) override {
    interests_.assign(interests.begin(), interests.end());
    const RecordedChannels channels(recordings_);
    std::vector<std::size_t> elements;
    for (const ChannelKey& key : interests_) {
      const PlistArray* recorded = elementsOf(channels.find(key));
      elements.push_back(recorded != nullptr ? recorded->size() : 0);
    }
    return elements;
  }

  void update() override { channels_.emplace(recordings_); }

  void write(std::size_t interest, const HubRoom& room) override {
    const ChannelKey& key = interests_[interest];
    const PlistDictionary* channel = channels_->find(key);
    const PlistArray* elements = elementsOf(channel);
    if (elements == nullptr) return;
    const std::uint64_t type = integerOrZero(*channel, "type");
    for (std::size_t i = 0; i < std::min(elements->size(), room.elements()); ++i) {
      const PlistValue& element = (*elements)[i];
      room.write(i, key, type, static_cast<std::uint64_t>(element.get("stamp").asInteger().value_or(0)),
                 wordsOf(element));
    }
  }

 private:
  // Words that are not given are 0.
  static std::array<std::uint64_t, HubRoom::kWords> wordsOf(const PlistValue& element) {
    std::array<std::uint64_t, HubRoom::kWords> words{};
    const PlistValue recorded = element.get("words");
    if (const PlistArray* given = recorded.asArray(); given != nullptr) {
      for (std::size_t i = 0; i < std::min(given->size(), words.size()); ++i)
        words[i] = static_cast<std::uint64_t>((*given)[i].asInteger().value_or(0));
    }
    return words;
  }

  Recordings& recordings_;
  std::vector<ChannelKey> interests_;
  std::optional<RecordedChannels> channels_;  // of the last update
};

}  // namespace

std::unique_ptr<UserClient> makeRecordedHub(const PlistDictionary& client, Recordings& recordings) {
  const HubStatuses statuses{statusOf(client, "userClientOpenStatus"), statusOf(client, "configureStatus"),
                             statusOf(client, "mapStatus"), statusOf(client, "updateStatus")};
  return makeHubClient(statuses, std::make_unique<RecordedHub>(recordings));
}

}  // namespace tbdaily

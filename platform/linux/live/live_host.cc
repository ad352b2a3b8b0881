#include "platform/linux/live/live_host.h"

#include <algorithm>
#include <ctime>
#include <utility>

#include "platform/linux/live/live_drivers.h"

namespace tbdaily {

namespace {

constexpr std::int64_t kHubIdentifier = 15;
constexpr std::string_view kNvmeDriver = "nvme";
constexpr std::uint64_t kNvmeIdentifier = 24;
constexpr std::string_view kTotals = "totals";

PlistValue text(std::string_view value) {
  return PlistValue::string(std::string(value));
}

PlistValue number(std::uint64_t value) {
  return PlistValue::int64(static_cast<std::int64_t>(value));
}

PlistValue registryEntry(std::int64_t identifier, std::string_view name, std::string_view entryClass,
                         PlistDictionary properties) {
  return PlistValue::dictionary({{"id", PlistValue::int64(identifier)},
                                 {"name", text(name)},
                                 {"class", text(entryClass)},
                                 {"properties", PlistValue::dictionary(std::move(properties))}});
}

LiveCategory categoryOf(std::string_view driver, const LiveChannel& channel) {
  const bool isDaily =
      driver == "pressure" || driver == "memory" || driver == kNvmeDriver || channel.group == kTotals;
  return isDaily ? LiveCategory::Daily : LiveCategory::OnDemand;
}

bool shareLegendGroup(const LiveChannel& a, const LiveChannel& b) {
  return a.group == b.group && a.subgroup == b.subgroup && a.unit == b.unit;
}

PlistValue legendGroup(const LiveChannel& first, PlistArray channels) {
  PlistDictionary group{{"KdReportGroupName", text(first.group)}};
  if (!first.subgroup.empty()) group.set("KdReportSubGroupName", text(first.subgroup));
  group.set(
      "KdReportChannelInfo",
      PlistValue::dictionary({{"KdReportChannelUnit", number(static_cast<std::uint64_t>(first.unit))}}));
  group.set("KdReportChannels", PlistValue::array(std::move(channels)));
  return PlistValue::dictionary(std::move(group));
}

std::uint64_t tickCount() {
  timespec now{};
  ::clock_gettime(CLOCK_MONOTONIC, &now);
  return static_cast<std::uint64_t>(now.tv_sec) * 1'000'000'000 + static_cast<std::uint64_t>(now.tv_nsec);
}

}  // namespace

LiveHost::LiveHost(const std::filesystem::path& root, Recordings& recordings)
    : recordings_(recordings), discovery_(root, found_) {
  PlistDictionary hub = registryEntry(kHubIdentifier, "KdReportHub", "KdReportHub", {}).mutableDictionary();
  hub.set("client", PlistValue::dictionary({{"kind", text(kHubKind)}}));
  PlistArray entries{PlistValue::dictionary(std::move(hub))};
  for (const LiveDriver& driver : kTextDrivers) {
    driver.discover(discovery_);
    addDriver(driver.name, driver.identifier, entries);
  }
  controllers_ = discoverNvme(discovery_, recordings_);
  addDriver(kNvmeDriver, kNvmeIdentifier, entries);
  entries_ = PlistValue::array(std::move(entries));
}

// Takes the channels that were just found.
void LiveHost::addDriver(std::string_view name, std::uint64_t identifier, PlistArray& entries) {
  const std::vector<LiveChannel> found = std::exchange(discovery_.channels(), {});
  PlistArray legend, group;
  for (std::size_t i = 0; i < found.size(); ++i) {
    const LiveChannel& channel = found[i];
    const ChannelKey key{identifier, liveChannelIdentifier(name, channel)};
    const std::uint64_t type = channel.type(categoryOf(name, channel));
    if (byKey_.emplace(key, channels_.size()).second) {
      channels_.push_back({key, type, channel.elements});
      group.push_back(PlistValue::array({number(key.channel), number(type), text(channel.name)}));
    }
    const bool isLastOfGroup = i + 1 == found.size() || !shareLegendGroup(channel, found[i + 1]);
    if (isLastOfGroup && !group.empty()) legend.push_back(legendGroup(channel, std::exchange(group, {})));
  }
  if (legend.empty()) return;
  entries.push_back(registryEntry(static_cast<std::int64_t>(identifier), name, "LinuxMetrics",
                                  {{"KdReportLegendPublic", PlistValue::boolean(true)},
                                   {"KdReportLegend", PlistValue::array(std::move(legend))}}));
}

const LiveHost::Channel* LiveHost::find(const ChannelKey& key) const {
  const auto found = byKey_.find(key);
  return found != byKey_.end() ? &channels_[found->second] : nullptr;
}

// The sources of the channels that somebody wants, and what they said last.
class LiveValues : public HubValues {
 public:
  explicit LiveValues(const LiveHost& host) : host_(host), readings_(host.found_) {}

  std::vector<std::size_t> configure(std::span<const ChannelKey> interests) override {
    std::vector<std::size_t> elements;
    std::vector<bool> isWanted(readings_.size());
    for (const ChannelKey& key : interests) {
      const LiveHost::Channel* channel = host_.find(key);
      elements.push_back(channel != nullptr ? channel->elements.size() : 0);
      interests_.push_back({channel, std::vector<Moved>(elements.back())});
      if (channel == nullptr) continue;
      for (const LiveElement& element : channel->elements) {
        for (const LiveWord* word : {&element.first, &element.second}) {
          for (const Slot slot : word->slots) isWanted[slot] = true;
        }
      }
    }
    openSources(isWanted);
    return elements;
  }

  // The first one, when the buffer is laid out, shows what was found; what comes after it is read.
  void update() override {
    ++updates_;
    ticks_ = tickCount();
    if (updates_ == 1) return;
    for (const auto& source : sources_) source->read(readings_);
  }

  void write(std::size_t interest, const HubRoom& room) override {
    Interest& wanted = interests_[interest];
    for (std::size_t i = 0; i < wanted.moved.size(); ++i) {
      const LiveElement& element = wanted.channel->elements[i];
      std::array<std::uint64_t, HubRoom::kWords> words{};
      std::uint64_t stamp = ticks_;
      const std::int64_t first = element.first.of(readings_), second = element.second.of(readings_);
      if (isOfStates(*wanted.channel)) {
        words = {element.identifier, static_cast<std::uint64_t>(first), static_cast<std::uint64_t>(second)};
        stamp = stampOf(wanted.moved[i], first, second);
      } else {
        words[0] = static_cast<std::uint64_t>(first);
      }
      room.write(i, wanted.channel->key, wanted.channel->type, stamp, words);
    }
  }

 private:
  // A state's words at the last update, and when it moved last.
  struct Moved {
    std::int64_t first = 0, second = 0;
    std::uint64_t stamp = 0;
  };
  struct Interest {
    const LiveHost::Channel* channel;  // null: not there
    std::vector<Moved> moved;          // by element
  };

  static bool isOfStates(const LiveHost::Channel& channel) { return (channel.type & 0xFF) == 2; }

  std::uint64_t stampOf(Moved& state, std::int64_t first, std::int64_t second) const {
    constexpr unsigned kFirstReading = 2;
    const bool hasMoved = updates_ > kFirstReading && (state.first != first || state.second != second);
    if (hasMoved) state.stamp = ticks_;
    state.first = first;
    state.second = second;
    return state.stamp;
  }

  void openSources(const std::vector<bool>& isWanted) {
    for (const auto& [file, cells] : host_.discovery_.textSources()) {
      std::vector<TextCell> wanted;
      std::ranges::copy_if(cells, std::back_inserter(wanted),
                           [&](const TextCell& cell) { return isWanted[cell.slot]; });
      if (!wanted.empty())
        sources_.push_back(openTextSource(host_.discovery_.place(file), std::move(wanted)));
    }
    for (const NvmeController& controller : host_.controllers_) {
      const bool isAnyWanted =
          std::ranges::any_of(controller.slots, [&](const auto& slot) { return slot && isWanted[*slot]; });
      if (isAnyWanted) sources_.push_back(openNvmeSource(host_.discovery_, host_.recordings_, controller));
    }
  }

  const LiveHost& host_;
  Readings readings_;
  std::vector<Interest> interests_;
  std::vector<std::unique_ptr<LiveSource>> sources_;
  unsigned updates_ = 0;
  std::uint64_t ticks_ = 0;
};

std::unique_ptr<HubValues> LiveHost::openValues() const {
  return std::make_unique<LiveValues>(*this);
}

}  // namespace tbdaily

// What this host's own drivers measure: found once, read for each subscription of its hub.
#pragma once

#include <filesystem>
#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

#include "platform/linux/live/live_discovery.h"
#include "platform/linux/live/nvme_driver.h"
#include "platform/linux/registry/hub_client.h"
#include "platform/plist_value.h"

namespace tbdaily {

// For any thread once it is made; what reads its values is for one thread at a time.
class LiveHost {
 public:
  // Looks through /proc, /sys and /dev below the root. Borrows the recordings, of which that of the NVMe
  // controllers answers in their place.
  LiveHost(const std::filesystem::path& root, Recordings& recordings);

  // As a driver registry lists them: the hub, and each driver that found something, with its legend.
  const PlistValue& entries() const { return entries_; }
  // The values of one subscription. Borrows this object.
  std::unique_ptr<HubValues> openValues() const;

  // A client of this kind is the hub's.
  static constexpr std::string_view kHubKind = "live";

 private:
  friend class LiveValues;
  struct Channel {
    ChannelKey key;
    std::uint64_t type;
    std::vector<LiveElement> elements;
  };

  void addDriver(std::string_view name, std::uint64_t identifier, PlistArray& entries);
  const Channel* find(const ChannelKey& key) const;

  Recordings& recordings_;
  Readings found_;  // the values when the host was looked through
  LiveDiscovery discovery_;
  std::vector<NvmeController> controllers_;
  std::vector<Channel> channels_;
  std::unordered_map<ChannelKey, std::size_t, ChannelKeyHash> byKey_;
  PlistValue entries_;
};

}  // namespace tbdaily

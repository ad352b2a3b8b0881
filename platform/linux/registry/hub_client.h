// A driver metrics hub: takes a list of interests once, lays out a buffer that it shares with the client, and
// has the values written into it each time it is asked.
#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <vector>

#include "platform/keyed_hash.h"
#include "platform/linux/registry/user_client.h"

namespace tbdaily {

struct ChannelKey {
  std::uint64_t driver = 0, channel = 0;
  friend bool operator==(const ChannelKey&, const ChannelKey&) = default;
};

struct ChannelKeyHash {
  std::size_t operator()(const ChannelKey& key) const { return KeyedHash::of(key.driver, key.channel); }
};

// The elements of one interest in the shared buffer.
class HubRoom {
 public:
  static constexpr std::size_t kElementBytes = 64, kWords = 4;

  explicit HubRoom(std::span<std::byte> bytes) : bytes_(bytes) {}

  std::size_t elements() const { return bytes_.size() / kElementBytes; }
  void write(std::size_t element, const ChannelKey& key, std::uint64_t type, std::uint64_t stamp,
             std::span<const std::uint64_t, kWords> words) const;

 private:
  std::span<std::byte> bytes_;
};

// What a hub measures, for one client.
class HubValues {
 public:
  virtual ~HubValues() = default;

  // Once, before all else: how many elements each interest has, in their order; 0 where it is not there.
  virtual std::vector<std::size_t> configure(std::span<const ChannelKey> interests) = 0;
  // Takes the values of this moment.
  virtual void update() = 0;
  // Writes them; `interest` is a place among the interests.
  virtual void write(std::size_t interest, const HubRoom& room) = 0;
};

// What the hub's calls answer, kKdSuccess as a rule.
struct HubStatuses {
  KdStatus open = kKdSuccess, configure = kKdSuccess, map = kKdSuccess, update = kKdSuccess;
};

std::unique_ptr<UserClient> makeHubClient(const HubStatuses& statuses, std::unique_ptr<HubValues> values);

}  // namespace tbdaily

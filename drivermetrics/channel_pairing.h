// Which channel of an earlier collection a channel of a later one is compared with.
#pragma once

#include <tuple>
#include <utility>
#include <vector>

#include "drivermetrics/channel_list.h"

namespace kdreport {

// Pairs the channels of one array, asked for in the order of the later array. A channel pairs with the one at
// its own index when both have the same driver, identifier and type, else with the next such one behind the
// last that a search found. Channels beyond the end of the earlier array have no partner. Searches take
// logarithmic time.
class ChannelPairing {
 public:
  // Borrows the earlier array.
  explicit ChannelPairing(const ChannelList& earlier) : earlier_(earlier) {}

  struct Result {
    bool isReadable = true;  // false: a channel that was looked at has no readable type
    const ChannelRecord* partner = nullptr;
  };
  Result partnerOf(const ChannelRecord& channel, std::size_t index);

 private:
  using Identity = std::tuple<std::int64_t, std::int64_t, std::uint64_t>;  // driver, channel, type
  using Place = std::pair<Identity, std::size_t>;                          // and its index

  static std::optional<Identity> identityOf(const ChannelRecord* channel) {
    const auto type = channel != nullptr ? channel->source->type() : std::nullopt;
    if (!type) return std::nullopt;
    return Identity{channel->driverID(), channel->channelID(), type->bits};
  }
  Result search(const Identity& wanted);
  void buildIndex();

  const ChannelList& earlier_;
  std::optional<std::size_t> resume_;    // none before the first search
  bool isIndexed_ = false;               // the index is built at the first search
  std::vector<Place> places_;            // sorted
  std::vector<std::size_t> unreadable_;  // ascending
};

}  // namespace kdreport

// What the drivers of a recorded registry say about their channels, for whoever makes up values for them.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <utility>
#include <vector>

#include "platform/plist_value.h"

namespace tbdaily {

// The meaning of a channel's values. A channel that no legend lists has neither unit nor buckets.
class ChannelMeaning {
 public:
  ChannelMeaning() = default;
  explicit ChannelMeaning(PlistValue channelInfo) : info_(std::move(channelInfo)) {}

  // The quantity of its unit, as unit codes number them; nothing without a unit.
  std::optional<std::uint8_t> quantity() const;
  // How many of its unit so many seconds are, rounded down, in wrapping arithmetic; nothing when the unit is
  // no time or its scale is not known.
  std::optional<std::uint64_t> unitsIn(std::uint64_t seconds) const;
  // The upper bounds of its histogram buckets, the first above 0 and each above the one before; none when
  // they are not configured or not so, or are more than there are buckets.
  std::vector<std::int64_t> bucketBounds(std::size_t buckets) const;

 private:
  std::optional<std::int64_t> unit() const;
  PlistValue info_;  // a dictionary, or none
};

class HubLegends {
 public:
  // Whatever in it is malformed counts as absent; of two entries for a channel the first counts.
  explicit HubLegends(const PlistValue& registryRoot);

  ChannelMeaning meaningOf(std::int64_t driver, std::int64_t channel) const;

 private:
  void addLegend(std::int64_t driver, const PlistArray& groups);
  std::map<std::pair<std::int64_t, std::int64_t>, PlistValue> channelInfos_;
};

}  // namespace tbdaily

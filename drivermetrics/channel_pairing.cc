#include "drivermetrics/channel_pairing.h"

#include <algorithm>

namespace kdreport {

ChannelPairing::Result ChannelPairing::partnerOf(const ChannelRecord& channel, std::size_t index) {
  if (index >= earlier_.size()) return {};
  const auto wanted = identityOf(&channel);
  const auto candidate = identityOf(earlier_[index]);
  if (!wanted || !candidate) return {.isReadable = false};
  if (candidate == wanted) return {.partner = earlier_[index]};
  if (!resume_) resume_ = index + 1;
  return search(*wanted);
}

ChannelPairing::Result ChannelPairing::search(const Identity& wanted) {
  buildIndex();
  const std::size_t from = *resume_;
  const auto found = std::lower_bound(places_.begin(), places_.end(), Place{wanted, from});
  const std::size_t hit = found != places_.end() && found->first == wanted ? found->second : earlier_.size();
  const auto odd = std::lower_bound(unreadable_.begin(), unreadable_.end(), from);
  if (odd != unreadable_.end() && *odd < hit) return {.isReadable = false};
  if (hit == earlier_.size()) return {};
  resume_ = hit + 1;
  return {.partner = earlier_[hit]};
}

void ChannelPairing::buildIndex() {
  if (isIndexed_) return;
  isIndexed_ = true;
  places_.reserve(earlier_.size());
  for (std::size_t i = 0; i < earlier_.size(); ++i) {
    if (const auto identity = identityOf(earlier_[i])) {
      places_.emplace_back(*identity, i);
    } else {
      unreadable_.push_back(i);
    }
  }
  std::ranges::sort(places_);
}

}  // namespace kdreport

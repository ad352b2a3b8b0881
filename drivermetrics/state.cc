// Reading state channels: identifiers and names, entries, residencies, the current state.

#include <limits>

#include "drivermetrics/values.h"

namespace kdreport {

namespace {

std::int64_t stateWord(const ChannelRecord* channel, std::int32_t index, std::size_t word) {
  return elementWord(channel, kKdReportState, index, word);
}

// None when one of the states has no printable identifier.
PlistValue namesOf(const ChannelRecord& channel) {
  const std::uint32_t announced = KdReportStateGetCount(&channel);
  if (announced == kKdReportNoIndex) return {};
  const auto states = announcedRawElements(&channel, kKdReportState);
  if (!states && announced != 0) return {};
  PlistArray names;
  for (std::size_t i = 0; i < announced; ++i) {
    const auto name = _copyPrintableIDString(states->word(i, state_word::kIdentifier));
    if (!name) return {};
    names.push_back(PlistValue::string(*name));
  }
  return PlistValue::array(std::move(names));
}

constexpr double kNoShare = std::numeric_limits<double>::quiet_NaN();

// Not a number when there is none or one cannot be read.
double residencyOfAllStates(const RawElements& states) {
  double all = 0;
  for (std::size_t i = 0; i < states.count(); ++i) {
    const std::int64_t residency = states.word(i, state_word::kResidency);
    if (residency == kKdReportInvalid) return kNoShare;
    all += static_cast<double>(residency);
  }
  return all != 0 ? all : kNoShare;
}

}  // namespace

std::uint32_t KdReportStateGetCount(const ChannelRecord* channel) {
  return announcedElements(channel, kKdReportState);
}

std::int64_t KdReportStateGetIDForIndex(const ChannelRecord* channel, std::int32_t index) {
  return stateWord(channel, index, state_word::kIdentifier);
}

std::int64_t KdReportStateGetInTransitions(const ChannelRecord* channel, std::int32_t index) {
  return stateWord(channel, index, state_word::kTransitions);
}

std::int64_t KdReportStateGetResidency(const ChannelRecord* channel, std::int32_t index) {
  return stateWord(channel, index, state_word::kResidency);
}

std::uint32_t KdReportStateGetIndexForID(const ChannelRecord* channel, std::int64_t id) {
  const auto states = announcedRawElements(channel, kKdReportState);
  for (std::uint32_t i = states ? states->count() : 0; i-- > 0;) {
    if (states->word(i, state_word::kIdentifier) == id) return i;
  }
  return kKdReportNoIndex;
}

std::optional<std::string_view> KdReportStateGetNameForIndex(const ChannelRecord* channel,
                                                             std::int32_t index) {
  if (channel == nullptr) return std::nullopt;
  const PlistValue& cached = channel->cached(CachedAnswer::StateNames);
  const PlistArray* names =
      (cached.isNone() ? channel->cache(CachedAnswer::StateNames, namesOf(*channel)) : cached).asArray();
  if (names == nullptr || index < 0 || static_cast<std::size_t>(index) >= names->size()) return std::nullopt;
  return (*names)[static_cast<std::size_t>(index)].asString();
}

double KdReportStateGetDutyCycle(const ChannelRecord* channel, std::int32_t index) {
  const std::int64_t residency = KdReportStateGetResidency(channel, index);
  if (residency == kKdReportInvalid) return kNoShare;
  return static_cast<double>(residency) /
         residencyOfAllStates(*announcedRawElements(channel, kKdReportState));
}

std::vector<double> KdReportStateCopyDutyCycles(const ChannelRecord* channel) {
  const auto states = announcedRawElements(channel, kKdReportState);
  if (!states) return {};
  const double all = residencyOfAllStates(*states);
  std::vector<double> shares(states->count(), kNoShare);
  for (std::size_t i = 0; i < shares.size(); ++i) {
    const std::int64_t residency = states->word(i, state_word::kResidency);
    if (residency != kKdReportInvalid) shares[i] = static_cast<double>(residency) / all;
  }
  return shares;
}

std::uint32_t KdReportStateGetCurrent(const ChannelRecord* channel) {
  const auto states = announcedRawElements(channel, kKdReportState);
  std::uint32_t current = kKdReportNoIndex;
  std::uint64_t latest = 0;
  for (std::uint32_t i = 0; states && i < states->count(); ++i) {
    if (states->stamp(i) <= latest) continue;
    latest = states->stamp(i);
    current = i;
  }
  return current;
}

}  // namespace kdreport

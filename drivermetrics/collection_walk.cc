// The walk: every operation that looks at all channels of a collection, in one of four modes.

#include <type_traits>

#include "drivermetrics/channel_collection.h"
#include "drivermetrics/channel_pairing.h"
#include "drivermetrics/load_ahead.h"
#include "drivermetrics/object_blocks.h"
#include "drivermetrics/raw_elements.h"

namespace kdreport {

namespace {

struct Visit {
  const KdReportVisitor& visitor;
};
struct Prune {
  const KdReportVisitor& visitor;
};
struct Clone {
  const CloneVisitor& visitor;
  RecordBlocks& records;
};
struct Compare {
  const CompareVisitor& visitor;
  RecordBlocks& records;
  ElementBlocks& elements;
};

template <typename Mode>
inline constexpr bool kPrunes = std::is_same_v<Mode, Prune>;
template <typename Mode>
inline constexpr bool kCompares = std::is_same_v<Mode, Compare>;
template <typename Mode>
inline constexpr bool kCopies = std::is_same_v<Mode, Clone> || kCompares<Mode>;

// Only pruning changes the collection that it walks.
template <typename Mode, typename T>
using Walked = std::conditional_t<kPrunes<Mode>, T, const T>;

bool isOdd(std::uint32_t status) {
  return (status & 1) != 0;
}

template <typename Mode>
std::uint32_t walk(const Mode& mode, Walked<Mode, ChannelCollection>* collection,
                   const ChannelCollection* other, ChannelCollection* result);

std::uint32_t visitChannels(const Visit& mode, const ChannelList& channels) {
  std::uint32_t status = 0;
  for (ChannelRecord* channel : channels) {
    const std::uint32_t answer = channel != nullptr ? mode.visitor(*channel) : kKdReportWalkFailed;
    if (isOdd(answer)) return answer;
    status |= answer;
  }
  return status;
}

// Channels that are judged in turn: what is removed moves behind what is kept and goes in the end, be it with
// an exception of the visitor.
struct Pruning {
  explicit Pruning(ChannelList& all) : channels(all) {}
  ~Pruning() { channels.erase(kept, next); }
  Pruning(const Pruning&) = delete;
  Pruning& operator=(const Pruning&) = delete;

  ChannelList& channels;
  std::size_t kept = 0, next = 0;
};

std::uint32_t pruneChannels(const Prune& mode, ChannelList& channels) {
  std::uint32_t status = 0, answer = 0;
  Pruning pruning(channels);
  for (; pruning.next < channels.size() && !isOdd(answer); ++pruning.next) {
    ChannelRecord* channel = channels[pruning.next];
    answer = channel != nullptr ? mode.visitor(*channel) : kKdReportWalkFailed;
    status |= answer;
    if (answer != kKdReportRemove) channels.swap(pruning.kept++, pruning.next);
  }
  return isOdd(answer) ? answer : status;
}

std::uint32_t cloneChannels(const Clone& mode, const ChannelList& channels, ChannelList& copies) {
  std::uint32_t status = 0;
  mode.records.expect(channels.size());
  copies.reserve(channels.size());
  for (const ChannelRecord* channel : channels) {
    if (channel == nullptr) return kKdReportWalkFailed;
    loadAhead(channel);
    loadAhead(channel->source);
    ChannelRecord& copy = mode.records.add(*channel);
    copy.shareElements(*channel);
    const std::uint32_t answer = mode.visitor(*channel, copy);
    if (isOdd(answer)) return answer;
    if (answer == kKdReportKeep) copies.add(&copy);
    status |= answer;
  }
  return status;
}

std::uint32_t compareChannels(const Compare& mode, const ChannelList& channels, const ChannelList& earlier,
                              ChannelList& copies) {
  std::uint32_t status = 0;
  ChannelPairing pairing(earlier);
  mode.records.expect(channels.size());
  copies.reserve(channels.size());
  for (std::size_t i = 0; i < channels.size(); ++i) {
    const ChannelRecord* channel = channels[i];
    if (channel == nullptr) return kKdReportWalkFailed;
    ChannelRecord& copy = mode.records.add(*channel);
    loadAhead(channel);
    loadAhead(channel->elements().data(), kElementSize);
    if (i < earlier.size() && earlier[i] != nullptr) {
      loadAhead(earlier[i]);
      loadAhead(earlier[i]->elements().data(), kElementSize);
    }
    const auto [isReadable, partner] = pairing.partnerOf(*channel, i);
    if (!isReadable) return kKdReportWalkFailed;
    std::uint32_t answer = kKdReportKeep;
    if (partner == nullptr) {
      copy.shareElements(*channel);
    } else {
      if (cloneElements(copy, *partner, ElementValues::Invalidate, &mode.elements) != kKdSuccess)
        return kKdReportWalkFailed;
      answer = mode.visitor(*partner, *channel, copy);
    }
    if (isOdd(answer)) return answer;
    if (answer == kKdReportKeep) copies.add(&copy);
    status |= answer;
  }
  return status;
}

// The channels filed at one level.
template <typename Mode>
std::uint32_t walkChannels(const Mode& mode, Walked<Mode, ChannelCollection>& collection,
                           const ChannelCollection* other, ChannelCollection* result) {
  if (collection.channels.isAbsent()) return 0;
  auto* channels = collection.channels.get();
  if (channels == nullptr) return kKdReportWalkFailed;
  if constexpr (kCompares<Mode>) {
    const ChannelList* earlier = other->channels.get();
    if (earlier == nullptr) return kKdReportWalkFailed;
    return compareChannels(mode, *channels, *earlier, result->channels.make());
  } else if constexpr (kCopies<Mode>) {
    return cloneChannels(mode, *channels, result->channels.make());
  } else if constexpr (kPrunes<Mode>) {
    const std::uint32_t status = pruneChannels(mode, *channels);
    if (!isOdd(status) && channels->empty()) collection.channels.remove();
    return status;
  } else {
    return visitChannels(mode, *channels);
  }
}

// Finds the sub-collections of the same names in another collection, quickest for those at the same places.
class NamePairing {
 public:
  // Null: there are none.
  explicit NamePairing(const SubCollections* other) : other_(other) {}

  // Null when there is no such dictionary.
  const ChannelCollection* partnerOf(const std::string& name, std::size_t index) {
    if (other_ == nullptr) return nullptr;
    const auto& entries = other_->entries();
    if (index < entries.size() && *entries[index].name == name) return entries[index].get();
    if (places_.empty()) {
      for (const SubCollection& entry : entries) places_.set(*entry.name, PlistValue::boolean(true));
    }
    const auto place = places_.positionOf(name);
    return place ? entries[*place].get() : nullptr;
  }

 private:
  const SubCollections* other_;
  PlistDictionary places_;  // made at the first search
};

// The sub-collections under one key. The first odd status is the walk's, and ends it; pruning still goes
// through the others.
template <typename Mode>
std::uint32_t walkNested(const Mode& mode, Walked<Mode, CollectionField<SubCollections>>& nested,
                         const CollectionField<SubCollections>* otherNested,
                         CollectionField<SubCollections>* results) {
  if (nested.isAbsent()) return 0;
  if (nested.get() == nullptr) return kKdReportWalkFailed;
  if (kCompares<Mode> && otherNested->get() == nullptr) return kKdReportWalkFailed;
  SubCollections* copies = kCopies<Mode> ? &results->make() : nullptr;
  if constexpr (kCopies<Mode>) copies->reserve(nested.get()->size());
  std::uint32_t status = 0;
  NamePairing pairing(kCompares<Mode> ? otherNested->get() : nullptr);
  for (std::size_t i = 0; i < nested.get()->size(); ++i) {
    auto& entry = nested.get()->entries()[i];
    const ChannelCollection* other = pairing.partnerOf(*entry.name, i);
    ChannelCollection* copy = kCopies<Mode> ? copies->add(entry.name).get() : nullptr;
    const std::uint32_t answer = walk(mode, entry.get(), other, copy);
    if (!isOdd(status)) status = isOdd(answer) ? answer : status | answer;
    if (isOdd(status) && !kPrunes<Mode>) return status;
  }
  if (isOdd(status)) return status;
  if constexpr (kPrunes<Mode>) {
    nested.get()->removeEmpty();
    if (nested.get()->empty()) nested.remove();
  }
  return status;
}

// `other` is the earlier collection when comparing; `result` is filled in the modes that make a copy, and is
// of no use after an odd status.
template <typename Mode>
std::uint32_t walk(const Mode& mode, Walked<Mode, ChannelCollection>* collection,
                   const ChannelCollection* other, ChannelCollection* result) {
  if (collection == nullptr || (kCompares<Mode> && other == nullptr)) return kKdReportWalkFailed;
  std::uint32_t status = walkChannels(mode, *collection, other, result);
  for (const auto key : {&ChannelCollection::drivers, &ChannelCollection::channelGroups}) {
    if (isOdd(status)) break;
    const std::uint32_t answer =
        walkNested(mode, collection->*key, other != nullptr ? &(other->*key) : nullptr,
                   result != nullptr ? &(result->*key) : nullptr);
    status = isOdd(answer) ? answer : status | answer;
  }
  return status;
}

}  // namespace

std::uint32_t KdReportIterate(const ChannelCollection* collection, const KdReportVisitor& visitor) {
  return visitor ? walk(Visit{visitor}, collection, nullptr, nullptr) : kKdReportWalkFailed;
}

std::uint32_t KdReportPrune(ChannelCollection* collection, const KdReportVisitor& visitor) {
  return visitor ? walk(Prune{visitor}, collection, nullptr, nullptr) : kKdReportWalkFailed;
}

std::uint32_t KdReportGetChannelCount(const ChannelCollection* collection) {
  std::uint32_t count = 0;
  const std::uint32_t status = KdReportIterate(collection, [&count](ChannelRecord&) -> std::uint32_t {
    ++count;
    return kKdReportKeep;
  });
  return status == 0 ? count : kKdReportNoIndex;
}

KdReportCollection cloneAggregate(const ChannelCollection* collection, const CloneVisitor& visitor) {
  auto result = std::make_shared<ChannelCollection>();
  RecordBlocks records;
  return isOdd(walk(Clone{visitor, records}, collection, nullptr, result.get())) ? nullptr : result;
}

KdReportCollection compareAggregates(const ChannelCollection* earlier, const ChannelCollection* later,
                                     const CompareVisitor& visitor) {
  auto result = std::make_shared<ChannelCollection>();
  RecordBlocks records;
  ElementBlocks elements;
  return walk(Compare{visitor, records, elements}, later, earlier, result.get()) != 0 ? nullptr : result;
}

}  // namespace kdreport

// Collections of channels, and the walk over them that everything goes through.
#pragma once

#include <utility>
#include <vector>

#include "drivermetrics/channel_list.h"

namespace kdreport {

// One key of a collection: absent, of the kind that belongs there, or, in one that came from outside, of
// another.
template <typename T>
class CollectionField {
 public:
  bool isAbsent() const { return !value_ && !isForeign_; }
  bool isForeign() const { return isForeign_; }
  T* get() { return value_ ? &*value_ : nullptr; }  // null when absent or of another kind
  const T* get() const { return value_ ? &*value_ : nullptr; }

  T& make() {
    isForeign_ = false;
    return value_.emplace();
  }
  void makeForeign() {
    value_.reset();
    isForeign_ = true;
  }
  void remove() {
    value_.reset();
    isForeign_ = false;
  }

 private:
  std::optional<T> value_;
  bool isForeign_ = false;
};

struct SubCollection;

// Names to sub-collections, in the order in which they were first filed. What is handed out stays until
// another one is added or some are removed.
class SubCollections {
 public:
  SubCollections();
  SubCollections(SubCollections&&) noexcept;
  SubCollections& operator=(SubCollections&&) noexcept;
  ~SubCollections();

  void reserve(std::size_t n);
  // Null when there is none.
  SubCollection* find(std::string_view name);
  // Null when the entry of the name is no dictionary.
  ChannelCollection* findOrMake(std::string_view name);
  // A new entry, empty and a dictionary. The name is another one's, or a new one.
  SubCollection& add(std::shared_ptr<const std::string> name);
  SubCollection& add(std::string_view name) { return add(std::make_shared<const std::string>(name)); }
  void removeEmpty();

  bool empty() const { return entries_.empty(); }
  std::size_t size() const;
  std::vector<SubCollection>& entries() { return entries_; }
  const std::vector<SubCollection>& entries() const { return entries_; }

 private:
  std::vector<SubCollection> entries_;
  PlistDictionary places_;  // name to its place, of the first entries; goes on when a name is looked for
};

// A collection or one of its sub-collections: channels filed at this level, then per driver, then per group
// (and below a group per subgroup).
class ChannelCollection {
 public:
  PlistValue queryOptions;                // number, 32-bit; of the outermost level only
  CollectionField<ChannelList> channels;  // a null one is an element that is no dictionary
  CollectionField<SubCollections> drivers, channelGroups;

  // Without any key, the options included.
  bool empty() const {
    return queryOptions.isNone() && channels.isAbsent() && drivers.isAbsent() && channelGroups.isAbsent();
  }
};

struct SubCollection {
  // Null when the entry is no dictionary.
  ChannelCollection* get() { return isDictionary ? &collection : nullptr; }
  const ChannelCollection* get() const { return isDictionary ? &collection : nullptr; }

  std::shared_ptr<const std::string> name;
  ChannelCollection collection;
  bool isDictionary = true;
};

// The options of the collection; 0 when it has none.
std::uint32_t _getAggregateOpts(const ChannelCollection* collection);

// Files the record itself by `options`, making the levels that it needs. kKdBadArgument for a null argument,
// kKdError when the driver's name is missing or something else than a dictionary or array is in the way; the
// reason is "_addChannel() failed".
KdStatus _addChannel(ChannelCollection* collection, const KdReportChannel& channel, std::uint32_t options,
                     KdReportErrorOut error = nullptr);

// A channel's legend entry. None ("couldn't create channel", kKdError) unless its identifier and type are
// numbers and the driver of the group has a name.
std::optional<LegendEntry> usableLegendEntry(const PlistValue& entry, const LegendGroup& group,
                                             KdReportErrorOut error);

// A new record of a channel.
KdReportChannel makeChannelRecord(std::shared_ptr<const LegendGroup> group, std::optional<LegendEntry> entry);

// Answer as KdReportVisitor does. `copy` is a copy of `channel` that goes into the new collection when kept.
using CloneVisitor = std::function<std::uint32_t(const ChannelRecord& channel, ChannelRecord& copy)>;
// `partner` is the channel of the earlier collection; `copy` carries its elements with all values invalid.
using CompareVisitor = std::function<std::uint32_t(const ChannelRecord& partner, const ChannelRecord& channel,
                                                   ChannelRecord& copy)>;

// A new collection of copies of the channels that the visitor keeps, filed as they are here, without options.
// Null when the walk fails or is stopped.
KdReportCollection cloneAggregate(const ChannelCollection* collection, const CloneVisitor& visitor);

// A new collection of copies of the channels of `later`: those with a partner in `earlier` as the visitor
// leaves them, the others as they are. Null unless every visit answers 0.
KdReportCollection compareAggregates(const ChannelCollection* earlier, const ChannelCollection* later,
                                     const CompareVisitor& visitor);

}  // namespace kdreport

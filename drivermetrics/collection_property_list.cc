// Collections as property lists, and back.

#include <array>

#include "drivermetrics/channel_collection.h"

namespace kdreport {

namespace {

using namespace kd_report_key;

// A filed collection has four levels: all, driver, group, subgroup.
constexpr int kMostLevels = 4;

struct GroupKey {
  std::string_view name;
  PlistValue LegendGroup::*value;
};

constexpr std::array<GroupKey, 5> kGroupKeys = {{
    {kDriverID, &LegendGroup::driverID},
    {kDriverName, &LegendGroup::driverName},
    {kGroupName, &LegendGroup::groupName},
    {kSubGroupName, &LegendGroup::subGroupName},
    {kChannelInfo, &LegendGroup::channelInfo},
}};
constexpr std::array<std::pair<std::string_view, CachedAnswer>, 4> kAnswerKeys = {{
    {kChannelName, CachedAnswer::ChannelName},
    {kUnitLabel, CachedAnswer::UnitLabel},
    {kProcessedChannelConfig, CachedAnswer::ProcessedChannelConfig},
    {kStateNames, CachedAnswer::StateNames},
}};

PlistValue plistOfLegend(const ChannelSource& source) {
  const auto& entry = source.legendChannel();
  PlistArray places{entry->channelID, legendType(source), entry->channelName};
  while (!places.empty() && places.back().isNone()) places.pop_back();
  return PlistValue::array(std::move(places));
}

PlistValue plistOfChannel(const ChannelRecord& channel) {
  PlistDictionary entries;
  for (const auto& [name, value] : kGroupKeys) entries.set(name, channel.group().*value);
  for (const auto& [name, answer] : kAnswerKeys) entries.set(name, channel.cached(answer));
  if (channel.source->legendChannel()) entries.set(kLegendChannel, plistOfLegend(*channel.source));
  const auto elements = channel.elements();
  if (channel.hasElements()) entries.set(kRawElements, PlistValue::data({elements.begin(), elements.end()}));
  return PlistValue::dictionary(std::move(entries));
}

KdReportChannel channelOfPlist(const PlistValue& value) {
  const PlistDictionary* entries = value.asDictionary();
  if (entries == nullptr) return nullptr;
  auto group = std::make_shared<LegendGroup>();
  for (const auto& [name, member] : kGroupKeys) (*group).*member = entries->get(name);
  KdReportChannel channel = makeChannelRecord(std::move(group), legendEntryOf(entries->get(kLegendChannel)));
  for (const auto& [name, answer] : kAnswerKeys) channel->cache(answer, entries->get(name));
  const PlistValue elements = entries->get(kRawElements);
  if (const auto bytes = elements.asData()) channel->copyElements(*bytes);
  return channel;
}

// In the place of what is malformed, whatever it was: it fails the walks that meet it, written and read back
// too.
PlistValue malformed() {
  return PlistValue::boolean(false);
}

PlistValue plistOfCollection(const ChannelCollection& collection);

PlistValue plistOf(const SubCollections& nested) {
  PlistDictionary entries;
  for (const SubCollection& entry : nested.entries())
    entries.set(*entry.name, entry.isDictionary ? plistOfCollection(entry.collection) : malformed());
  return PlistValue::dictionary(std::move(entries));
}

PlistValue plistOf(const ChannelList& channels) {
  PlistArray records;
  records.reserve(channels.size());
  for (const ChannelRecord* channel : channels)
    records.push_back(channel != nullptr ? plistOfChannel(*channel) : malformed());
  return PlistValue::array(std::move(records));
}

template <typename T>
PlistValue plistOf(const CollectionField<T>& field) {
  if (field.isForeign()) return malformed();
  return field.get() != nullptr ? plistOf(*field.get()) : PlistValue();
}

PlistValue plistOfCollection(const ChannelCollection& collection) {
  PlistDictionary entries;
  entries.set(kQueryOptions, collection.queryOptions);
  entries.set(kChannels, plistOf(collection.channels));
  entries.set(kDrivers, plistOf(collection.drivers));
  entries.set(kChannelGroups, plistOf(collection.channelGroups));
  return PlistValue::dictionary(std::move(entries));
}

// False when the value is no dictionary; `isTooDeep` is set when it is nested beyond the levels that are
// left.
bool readCollection(ChannelCollection& collection, const PlistValue& value, int levels, bool& isTooDeep);

void readNested(CollectionField<SubCollections>& field, const PlistValue& value, int levels,
                bool& isTooDeep) {
  if (value.isNone()) return;
  const PlistDictionary* entries = value.asDictionary();
  if (entries == nullptr) return field.makeForeign();
  SubCollections& nested = field.make();
  nested.reserve(entries->size());
  for (const auto& [name, element] : *entries) {
    SubCollection& entry = nested.add(name);
    entry.isDictionary = readCollection(entry.collection, element, levels, isTooDeep);
  }
}

void readChannels(CollectionField<ChannelList>& field, const PlistValue& value) {
  if (value.isNone()) return;
  const PlistArray* records = value.asArray();
  if (records == nullptr) return field.makeForeign();
  auto& channels = field.make();
  channels.reserve(records->size());
  for (const PlistValue& record : *records) channels.add(channelOfPlist(record).get());
}

bool readCollection(ChannelCollection& collection, const PlistValue& value, int levels, bool& isTooDeep) {
  const PlistDictionary* entries = value.asDictionary();
  isTooDeep = isTooDeep || (entries != nullptr && levels == 0);
  if (entries == nullptr || isTooDeep) return false;
  collection.queryOptions = entries->get(kQueryOptions);
  readChannels(collection.channels, entries->get(kChannels));
  readNested(collection.drivers, entries->get(kDrivers), levels - 1, isTooDeep);
  readNested(collection.channelGroups, entries->get(kChannelGroups), levels - 1, isTooDeep);
  return true;
}

}  // namespace

PlistValue KdReportCopyPropertyList(const ChannelCollection* collection) {
  return collection != nullptr ? plistOfCollection(*collection) : PlistValue();
}

KdReportCollection KdReportCreateAggregateFromPropertyList(const PlistValue& value) {
  bool isTooDeep = false;
  auto collection = std::make_shared<ChannelCollection>();
  return readCollection(*collection, value, kMostLevels, isTooDeep) && !isTooDeep ? collection : nullptr;
}

}  // namespace kdreport

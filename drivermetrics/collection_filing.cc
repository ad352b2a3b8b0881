// Making collections and filing channels in them.

#include <limits>

#include "drivermetrics/channel_collection.h"
#include "drivermetrics/object_blocks.h"
#include "drivermetrics/report_error.h"

namespace kdreport {

namespace {

// The sub-collection of the name, with what leads to it made when absent; null when something else is there.
ChannelCollection* moveTo(CollectionField<SubCollections>& field, std::string_view name) {
  if (field.isAbsent()) field.make();
  return field.get() != nullptr ? field.get()->findOrMake(name) : nullptr;
}

// The level at which the channel is filed, made when absent; null when it cannot be reached.
ChannelCollection* levelFor(ChannelCollection& collection, const ChannelRecord& channel,
                            std::uint32_t options) {
  ChannelCollection* level = &collection;
  if ((options & kKdReportFileByDriver) != 0) {
    const auto driver = KdReportChannelGetDriverName(&channel);
    if (!driver) return nullptr;
    level = moveTo(level->drivers, *driver);
  }
  const auto group = KdReportChannelGetGroup(&channel);
  if ((options & kKdReportFileByGroup) == 0 || !group) return level;
  if (level != nullptr) level = moveTo(level->channelGroups, *group);
  const auto subGroup = KdReportChannelGetSubGroup(&channel);
  if (level != nullptr && subGroup) level = moveTo(level->channelGroups, *subGroup);
  return level;
}

KdStatus file(ChannelCollection* collection, const KdReportChannel& channel, std::uint32_t options) {
  if (collection == nullptr || channel == nullptr) return kKdBadArgument;
  ChannelCollection* level = levelFor(*collection, *channel, options);
  if (level == nullptr) return kKdError;
  if (level->channels.isAbsent()) level->channels.make();
  if (level->channels.get() == nullptr) return kKdError;
  level->channels.get()->add(channel.get());
  return kKdSuccess;
}

PlistValue textOrNone(const KdReportOwnedText& text) {
  return text.get() ? PlistValue::string(*text.get()) : PlistValue();
}

}  // namespace

void ChannelList::erase(std::size_t begin, std::size_t end) {
  if (begin == end) return;
  const auto at = [this](std::size_t place) {
    return channels_.begin() + static_cast<std::ptrdiff_t>(place);
  };
  channels_.erase(at(begin), at(end));
  // Blocks came in the order of the channels: those that stay are met in that order again.
  std::size_t next = 0;
  blocks_.removeIf([this, &next](const RecordBlock& block) {
    const std::size_t first = next;
    while (next < size() && (channels_[next] == nullptr || channels_[next]->block == &block)) ++next;
    return next == first;
  });
}

SubCollections::SubCollections() = default;
SubCollections::SubCollections(SubCollections&&) noexcept = default;
SubCollections& SubCollections::operator=(SubCollections&&) noexcept = default;
SubCollections::~SubCollections() = default;

void SubCollections::reserve(std::size_t n) {
  entries_.reserve(n);
}

std::size_t SubCollections::size() const {
  return entries_.size();
}

SubCollection* SubCollections::find(std::string_view name) {
  while (places_.size() < entries_.size())
    places_.set(*entries_[places_.size()].name, PlistValue::boolean(true));
  const auto place = places_.positionOf(name);
  return place ? &entries_[*place] : nullptr;
}

ChannelCollection* SubCollections::findOrMake(std::string_view name) {
  SubCollection* entry = find(name);
  return entry != nullptr ? entry->get() : add(name).get();
}

SubCollection& SubCollections::add(std::shared_ptr<const std::string> name) {
  SubCollection& entry = entries_.emplace_back();
  entry.name = std::move(name);
  return entry;
}

void SubCollections::removeEmpty() {
  const auto isEmpty = [](const SubCollection& entry) {
    return entry.isDictionary && entry.collection.empty();
  };
  if (std::erase_if(entries_, isEmpty) != 0) places_ = {};
}

KdReportCollection KdReportCreateAggregate(std::uint32_t options) {
  auto collection = std::make_shared<ChannelCollection>();
  collection->queryOptions = PlistValue::int32(static_cast<std::int32_t>(options));
  return collection;
}

std::uint32_t _getAggregateOpts(const ChannelCollection* collection) {
  const auto options = collection != nullptr ? collection->queryOptions.asNumber() : std::nullopt;
  const bool isConvertible = options && options->toDouble() == static_cast<double>(options->toInt64()) &&
                             options->toInt64() >= std::numeric_limits<std::int32_t>::min() &&
                             options->toInt64() <= std::int64_t{std::numeric_limits<std::uint32_t>::max()};
  return isConvertible ? static_cast<std::uint32_t>(options->toInt64()) : std::uint32_t{kKdReportFlat};
}

KdStatus _addChannel(ChannelCollection* collection, const KdReportChannel& channel, std::uint32_t options,
                     KdReportErrorOut error) {
  const KdStatus status = file(collection, channel, options);
  if (status != kKdSuccess) setError(error, status, "_addChannel() failed");
  return status;
}

std::optional<LegendEntry> usableLegendEntry(const PlistValue& entry, const LegendGroup& group,
                                             KdReportErrorOut error) {
  auto places = legendEntryOf(entry);
  if (places && !group.driverName.isNone() && integerOrInvalid(places->channelID) != kKdReportInvalid &&
      integerOrInvalid(places->channelType) != kKdReportInvalid) {
    return places;
  }
  setError(error, kKdError, "couldn't create channel");
  return std::nullopt;
}

KdReportChannel makeChannelRecord(std::shared_ptr<const LegendGroup> group,
                                  std::optional<LegendEntry> entry) {
  SourceBlocks sources(std::move(group));
  RecordBlocks records;
  return KdReportRetainChannel(records.add(sources.add(std::move(entry))));
}

KdStatus KdReportAddChannelDescription(ChannelCollection* collection,
                                       const KdReportChannelDescription& description,
                                       KdReportErrorOut error) {
  PlistArray places{PlistValue::int64(description.channelID),
                    PlistValue::int64(static_cast<std::int64_t>(description.channelType.bits))};
  if (description.channelName.get()) places.push_back(textOrNone(description.channelName));
  const bool hasInfo = description.channelInfo.asDictionary() != nullptr;
  const auto group = std::make_shared<const LegendGroup>(
      LegendGroup{PlistValue::int64(description.driverID), textOrNone(description.driverName),
                  textOrNone(description.groupName), textOrNone(description.subGroupName),
                  hasInfo ? description.channelInfo : PlistValue()});
  auto entry = usableLegendEntry(PlistValue::array(std::move(places)), *group, error);
  if (!entry) return kKdError;
  return _addChannel(collection, makeChannelRecord(group, std::move(entry)), _getAggregateOpts(collection),
                     error);
}

std::uint32_t KdReportMergeChannels(ChannelCollection* destination, const ChannelCollection* source,
                                    KdReportErrorOut error) {
  if (destination == nullptr || source == nullptr || destination == source) {
    setError(error, kKdBadArgument, "bad argument");
    return kKdReportWalkFailed;
  }
  const std::uint32_t options = _getAggregateOpts(destination);
  const std::uint32_t walked = KdReportIterate(source, [&](ChannelRecord& channel) -> std::uint32_t {
    const KdStatus status = _addChannel(destination, KdReportRetainChannel(channel), options, error);
    return status == kKdSuccess ? kKdReportKeep : kKdReportStop;
  });
  if (walked == kKdReportWalkFailed) setError(error, kKdError);
  return walked;
}

}  // namespace kdreport

// Reading the legends that drivers publish in the registry.

#include "drivermetrics/channel_collection.h"
#include "drivermetrics/object_blocks.h"
#include "drivermetrics/report_error.h"
#include "drivermetrics/text_format.h"

namespace kdreport {

namespace {

PlistValue stringOrNone(PlistValue value) {
  return value.asString() ? std::move(value) : PlistValue();
}
PlistValue dictionaryOrNone(PlistValue value) {
  return value.asDictionary() != nullptr ? std::move(value) : PlistValue();
}

// Who publishes the channels of a legend: read once, and only when a channel asks for it.
class Publisher {
 public:
  Publisher(DriverRegistry& registry, KdHandle driver) : registry_(registry), driver_(driver) {}

  // The driver's part of a legend group, or none with the error filled.
  std::optional<LegendGroup> group(KdReportErrorOut error) {
    if (!isRead_) read();
    if (status_ == kKdSuccess) return LegendGroup{identifier_, name_, {}, {}, {}};
    setError(error, status_, "error extracting driver info");
    return std::nullopt;
  }

 private:
  void read() {
    isRead_ = true;
    std::uint64_t identifier = 0;
    status_ = registry_.KdRegistryEntryGetRegistryEntryID(driver_, identifier);
    identifier_ = PlistValue::int64(static_cast<std::int64_t>(identifier));
    const auto name = KdReportCopyDriverName(registry_, driver_);
    name_ = name ? PlistValue::string(*name) : PlistValue();
  }

  DriverRegistry& registry_;
  KdHandle driver_;
  bool isRead_ = false;
  KdStatus status_ = kKdSuccess;
  PlistValue identifier_, name_;
};

// The channels of one legend group. kKdError when one cannot be built or filed.
KdStatus addGroupChannels(ChannelCollection& collection, Publisher& publisher,
                          const PlistDictionary& legendGroup, const PlistArray& entries,
                          std::uint32_t options) {
  if (entries.empty() || entries.front().asArray() == nullptr) return kKdSuccess;
  auto described = publisher.group(nullptr);
  if (!described) return kKdError;
  described->groupName = stringOrNone(legendGroup.get(kd_report_key::kGroupName));
  described->subGroupName = stringOrNone(legendGroup.get(kd_report_key::kSubGroupName));
  described->channelInfo = dictionaryOrNone(legendGroup.get(kd_report_key::kChannelInfo));
  const auto group = std::make_shared<const LegendGroup>(std::move(*described));
  SourceBlocks sources(group);
  RecordBlocks records;
  sources.expect(entries.size());
  records.expect(entries.size());
  for (const PlistValue& value : entries) {
    if (value.asArray() == nullptr) break;
    auto entry = usableLegendEntry(value, *group, nullptr);
    if (!entry) return kKdError;
    ChannelRecord& channel = records.add(sources.add(std::move(entry)));
    if (_addChannel(&collection, KdReportRetainChannel(channel), options) != kKdSuccess) return kKdError;
  }
  return kKdSuccess;
}

// Files the channels of a legend. A group that is malformed ends the reading, and what was read stays.
KdStatus _addLegendChannels(ChannelCollection& collection, DriverRegistry& registry, KdHandle driver,
                            const PlistArray& legend, std::uint32_t options) {
  Publisher publisher(registry, driver);
  for (const PlistValue& element : legend) {
    const PlistDictionary* group = element.asDictionary();
    if (group == nullptr) return kKdSuccess;
    const bool hasGroup = group->get(kd_report_key::kGroupName).asString().has_value();
    if (!hasGroup && group->get(kd_report_key::kSubGroupName).asString()) return kKdSuccess;
    const PlistValue entries = group->get(kd_report_key::kChannels);
    if (entries.asArray() == nullptr) return kKdSuccess;
    const KdStatus status = addGroupChannels(collection, publisher, *group, *entries.asArray(), options);
    if (status != kKdSuccess) return status;
  }
  return kKdSuccess;
}

// Hands every matching driver to the step until one answers something else than 0, which then is the result.
// kKdAborted when the registry changed meanwhile.
KdStatus walkMatchingDrivers(DriverRegistry& registry, const PlistValue& matching,
                             const std::function<KdStatus(KdHandle)>& step) {
  KdHandle iterator = 0;
  KdStatus status = registry.KdServiceGetMatchingServices(matching, iterator);
  const DriverHandle iteratorOwner(registry, iterator);
  while (status == kKdSuccess && registry.KdIteratorIsValid(iterator)) {
    const DriverHandle driver(registry, registry.KdIteratorNext(iterator));
    if (driver.get() == 0) break;
    status = step(driver.get());
  }
  if (status == kKdSuccess && !registry.KdIteratorIsValid(iterator)) status = kKdAborted;
  return status;
}

KdReportCollection collectionOrError(KdStatus status, KdReportCollection collection, bool isExplained,
                                     KdReportErrorOut error) {
  if (status == kKdSuccess) return collection;
  if (!isExplained) setError(error, status);
  return nullptr;
}

}  // namespace

std::optional<std::string> KdReportCopyDriverName(DriverRegistry& registry, KdHandle driver) {
  std::string name;
  std::uint64_t identifier = 0;
  if (registry.KdRegistryEntryGetName(driver, name) != kKdSuccess ||
      registry.KdRegistryEntryGetRegistryEntryID(driver, identifier) != kKdSuccess) {
    return std::nullopt;
  }
  return std::move(name) + " <id " + alternateHexadecimal(identifier) + ">";
}

KdReportCollection KdReportCopyChannelsForDriver(DriverRegistry& registry, KdHandle driver,
                                                 std::uint32_t options, KdReportErrorOut error) {
  const auto fail = [error](KdStatus status, std::optional<std::string_view> reason) {
    setError(error, status, reason);
    return nullptr;
  };
  if (driver == 0 || registry.KdObjectGetUserRetainCount(driver) == 0)
    return fail(kKdBadArgument, "invalid driver");
  KdReportCollection collection = KdReportCreateAggregate(options);
  if (registry.KdRegistryEntryCreateCFProperty(driver, kd_report_key::kLegendPublic).isNone())
    return collection;
  const PlistValue legend = registry.KdRegistryEntryCreateCFProperty(driver, kd_report_key::kLegend);
  if (legend.isNone()) return fail(kKdNotFound, "no legend");
  if (legend.asArray() == nullptr) return fail(kKdInternalError, "bad legend");
  const KdStatus status = _addLegendChannels(*collection, registry, driver, *legend.asArray(), options);
  return status == kKdSuccess ? collection : fail(status, std::nullopt);
}

KdReportCollection KdReportCopyAllChannels(DriverRegistry& registry, std::uint32_t options,
                                           KdReportErrorOut error) {
  const PlistDictionary isPublic{{std::string(kd_report_key::kLegendPublic), PlistValue::boolean(true)}};
  const PlistValue matching = PlistValue::dictionary(
      {{std::string(kd_matching_key::kPropertyMatch), PlistValue::dictionary(isPublic)}});
  const KdReportCollection all = KdReportCreateAggregate(options);
  bool isExplained = false;
  const KdStatus status = walkMatchingDrivers(registry, matching, [&](KdHandle driver) {
    std::optional<ReportError> why;
    const KdReportCollection channels = KdReportCopyChannelsForDriver(registry, driver, options, &why);
    if (channels == nullptr) {
      kdrErrLog(why->code, KdReportCopyDriverName(registry, driver), why);
      return kKdSuccess;
    }
    const std::uint32_t merged = KdReportMergeChannels(all.get(), channels.get(), error);
    isExplained = merged != 0;
    return static_cast<KdStatus>(merged);
  });
  return collectionOrError(status, all, isExplained, error);
}

KdReportCollection KdReportCopyChannelsForDrivers(DriverRegistry& registry, const PlistValue& matching,
                                                  std::uint32_t options, KdReportErrorOut error) {
  const KdReportCollection all = KdReportCreateAggregate(options);
  if (matching.isNone()) {
    setError(error, kKdBadArgument, "no matching dict");
    return nullptr;
  }
  const KdStatus status = walkMatchingDrivers(registry, matching, [&](KdHandle driver) {
    const KdReportCollection channels = KdReportCopyChannelsForDriver(registry, driver, kKdReportFlat);
    if (channels == nullptr) return kKdError;
    return static_cast<KdStatus>(KdReportMergeChannels(all.get(), channels.get()));
  });
  return collectionOrError(status, all, false, error);
}

KdReportCollection KdReportCopyChannelsWithID(DriverRegistry& registry, const PlistValue& matching,
                                              std::int64_t channelID, KdReportErrorOut error) {
  if (matching.isNone()) return nullptr;
  const KdReportCollection all = KdReportCreateAggregate(kKdReportFlat);
  const PlistValue entry = PlistValue::array({PlistValue::int64(channelID), PlistValue::int64(0)});
  bool isExplained = false;
  const KdStatus status = walkMatchingDrivers(registry, matching, [&](KdHandle driver) {
    const auto group = Publisher(registry, driver).group(error);
    auto usable = group ? usableLegendEntry(entry, *group, error) : std::nullopt;
    const bool isFiled =
        usable &&
        _addChannel(all.get(), makeChannelRecord(std::make_shared<const LegendGroup>(*group), usable),
                    kKdReportFlat, error) == kKdSuccess;
    isExplained = !isFiled;
    return isFiled ? kKdSuccess : kKdError;
  });
  return collectionOrError(status, all, isExplained, error);
}

}  // namespace kdreport

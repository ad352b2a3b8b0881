// Ready-made selections: all public channels, narrowed by a predicate.

#include "drivermetrics/channel_collection.h"
#include "drivermetrics/report_error.h"

namespace kdreport {

namespace {

template <typename Predicate>
KdReportVisitor keepWhen(Predicate isKept) {
  return [isKept](ChannelRecord& channel) -> std::uint32_t {
    return isKept(channel) ? kKdReportKeep : kKdReportRemove;
  };
}

// The walk's status, or 1 when it failed.
std::uint32_t prune(ChannelCollection* collection, const KdReportVisitor& visitor, KdReportErrorOut error) {
  const std::uint32_t status = KdReportPrune(collection, visitor);
  if ((status & 1) == 0) return status;
  setError(error, kKdError, "channel pruning failed");
  return kKdReportStop;
}

KdReportCollection copyAndPrune(DriverRegistry& registry, std::uint32_t options,
                                const KdReportVisitor& visitor, KdReportErrorOut error) {
  KdReportCollection channels = KdReportCopyAllChannels(registry, options, error);
  if (channels == nullptr || prune(channels.get(), visitor, error) == kKdReportStop) return nullptr;
  return channels;
}

}  // namespace

KdReportCollection KdReportCopyChannelsInCategories(DriverRegistry& registry, std::int32_t mask,
                                                    std::uint32_t options, KdReportErrorOut error) {
  const auto isInCategories = [mask](const ChannelRecord& channel) {
    return (static_cast<std::uint16_t>(mask) & KdReportChannelGetCategories(&channel)) != 0;
  };
  return copyAndPrune(registry, options, keepWhen(isInCategories), error);
}

KdReportCollection KdReportCopyChannelsOfFormat(DriverRegistry& registry, std::int32_t format,
                                                std::uint32_t options, KdReportErrorOut error) {
  const auto isOfFormat = [format](const ChannelRecord& channel) {
    return KdReportChannelGetFormat(&channel) == static_cast<std::uint8_t>(format);
  };
  return copyAndPrune(registry, options, keepWhen(isOfFormat), error);
}

KdReportCollection KdReportCopyChannelsWithUnit(DriverRegistry& registry, std::int64_t unit,
                                                std::uint32_t options, KdReportErrorOut error) {
  const auto hasUnit = [unit](const ChannelRecord& channel) {
    return KdReportChannelGetUnit(&channel) == unit;
  };
  return copyAndPrune(registry, options, keepWhen(hasUnit), error);
}

std::uint32_t KdReportSelectChannelsInGroup(ChannelCollection* collection, KdReportText group,
                                            KdReportText subGroup, KdReportErrorOut error) {
  const auto wantedGroup = group.get(), wantedSubGroup = subGroup.get();
  if (!wantedGroup && !wantedSubGroup) {
    setError(error, kKdBadArgument, "no group or subgroup!");
    return kKdReportStop;
  }
  const auto isInGroup = [&](const ChannelRecord& channel) {
    return (!wantedGroup || KdReportChannelGetGroup(&channel) == wantedGroup) &&
           (!wantedSubGroup || KdReportChannelGetSubGroup(&channel) == wantedSubGroup);
  };
  return prune(collection, keepWhen(isInGroup), error);
}

KdReportCollection KdReportCopyChannelsInGroup(DriverRegistry& registry, KdReportText group,
                                               KdReportText subGroup, std::uint32_t options,
                                               KdReportErrorOut error) {
  KdReportCollection channels = KdReportCopyAllChannels(registry, options, error);
  if (channels == nullptr) return nullptr;
  const std::uint32_t status = KdReportSelectChannelsInGroup(channels.get(), group, subGroup, error);
  return (status & 1) == 0 ? channels : nullptr;
}

}  // namespace kdreport

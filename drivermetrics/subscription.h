// The hub connection behind a subscription.
#pragma once

#include <vector>

#include "drivermetrics/kd_report.h"

namespace kdreport {

// What of the hub is held: released, and the buffer unmapped, with the last reference.
class KdReportSubscription {
 public:
  explicit KdReportSubscription(DriverRegistry& registry) : registry_(registry) {}
  ~KdReportSubscription();
  KdReportSubscription(const KdReportSubscription&) = delete;
  KdReportSubscription& operator=(const KdReportSubscription&) = delete;

  // The three steps of subscribing, in this order. Each fills the error with its reason and the hub's status.
  bool connect(KdReportErrorOut error);
  bool configure(std::span<const std::byte> interestList, KdReportErrorOut error);
  bool mapBuffer(KdReportErrorOut error);

  // Has the hub write the current values into the buffer.
  KdStatus update() const;
  // Empty until it is mapped.
  std::span<const std::byte> buffer() const { return mapping_.value_or(std::span<std::byte>()); }

 private:
  KdStatus openHub(KdReportErrorOut error);
  // The buffer's identifier names its memory by the low half.
  std::uint32_t memoryType() const { return static_cast<std::uint32_t>(bufferIdentifier_); }

  DriverRegistry& registry_;
  KdHandle connection_ = 0;
  std::uint64_t bufferIdentifier_ = 0;
  std::optional<std::span<std::byte>> mapping_;  // may be of no bytes, which is to be unmapped all the same
};

// The size in bytes of an interest list of `count` channels; none when it would reach 2^31.
std::optional<std::size_t> interestListSize(std::uint32_t count);

// What the hub is told: the number of channels (32 bits), 32 bits of zero, then driver, identifier and type
// (64 bits each) of every channel in the order of the walk. None when a channel cannot be named so, or their
// number is not `count`.
std::optional<std::vector<std::byte>> createInterestList(const ChannelCollection* channels,
                                                         std::uint32_t count);

// The hub's update status; kKdBadArgument without a subscription.
KdStatus updateKernelBuffer(KdReportSubscription* subscription, KdReportErrorOut error);

}  // namespace kdreport

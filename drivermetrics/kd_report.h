// The driver metrics library: the channels that kernel drivers publish, found, selected, sampled, compared,
// read and described.
//
// A channel is one metric of a driver. Its record says who publishes it and how to read it; a collection
// holds records, flat or filed per driver and per group. The way to values:
//
//   KdReportCollection channels = KdReportCopyAllChannels(registry, kKdReportFileByDriver);
//   KdReportCollection subscribed;
//   auto subscription = KdReportCreateSubscription(registry, nullptr, channels.get(), &subscribed, 0);
//   KdReportCollection samples = KdReportCreateSamples(subscription.get(), subscribed.get());
//   KdReportIterate(samples.get(), [](ChannelRecord& channel) { ...; return kKdReportKeep; });
//
// Ownership. What Copy and Create operations return is new and the caller's. Collections refer to records:
// merging puts the same record into a second collection, and what is cached in it shows in both. A record
// lives as long as a collection or a KdReportChannel refers to it (KdReportRetainChannel makes one in a
// visitor), and keeps alive the block of memory that it lies in: at most 256 records with their elements.
// The strings that Get operations return are borrowed and live as long as the record. A sample's record is a
// copy of the subscribed one that shares the legend entry with it: a type that the first sampling finds out
// shows in the subscribed record too.
//
// Failures. Nothing throws but a failed allocation of the C++ runtime, and what a visitor throws. An
// operation that can fail takes an optional `error`, which is filled on every failure and on failure only.
// Null channels, collections and texts are allowed everywhere and answer as the operation says, or as if
// there were nothing.
//
// Threads. Whatever takes a const channel or collection may run in any number of threads at once, on the same
// records too, and sampling counts among that: what it caches or finds out is published safely. What changes
// a collection (adding, merging into it, pruning) needs that collection for itself. One subscription is for
// one thread at a time, since its samplings share a buffer; different subscriptions are independent when
// their registry may be called from several threads, as that of the host may.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <memory_resource>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "drivermetrics/kd_report_layout.h"
#include "drivermetrics/platform_names.h"
#include "drivermetrics/report_text.h"

namespace kdreport {

// ---- The model

class ChannelRecord;
class ChannelCollection;
class KdReportSubscription;

using KdReportChannel = std::shared_ptr<ChannelRecord>;
using KdReportCollection = std::shared_ptr<ChannelCollection>;

// What 64-bit operations answer for a value that is missing or no number.
inline constexpr std::int64_t kKdReportInvalid = INT64_MIN;
// What count and index operations answer for a channel that has none.
inline constexpr std::uint32_t kKdReportNoIndex = 0xFFFFFFFF;
// The categories of a channel whose type cannot be read.
inline constexpr std::uint16_t kKdReportAllCategories = 0xFFFF;

// How a channel's values are to be read. Other values occur and have no accessors.
enum KdReportFormat : std::uint8_t {
  kKdReportUnknownFormat = 0,  // until the first sample says
  kKdReportSimple = 1,         // one integer
  kKdReportState = 2,          // entries into and time spent in each of several states
  kKdReportHistogram = 3,      // hits, minimum, maximum and sum of each of several buckets
  kKdReportArray = 4,          // integers
};

// How a collection files its channels: any combination of these bits.
enum KdReportOptions : std::uint32_t {
  kKdReportFlat = 0,
  kKdReportFileByDriver = 1,
  kKdReportFileByGroup = 2,
};

// A channel's packed type, as drivers publish it.
struct ChannelType {
  std::uint64_t bits = 0;

  std::uint8_t format() const { return static_cast<std::uint8_t>(bits); }
  std::uint16_t categories() const { return static_cast<std::uint16_t>(bits >> 16); }
  // The number of 64-byte elements: 1 for a simple channel, the states, the buckets.
  std::uint16_t elementCount() const { return static_cast<std::uint16_t>(bits >> 32); }
  friend bool operator==(ChannelType, ChannelType) = default;
};

// Why an operation failed.
struct ReportError {
  std::string domain;  // of the code: always the kernel's statuses
  KdStatus code = 0;
  std::string reason;
};
using KdReportErrorOut = std::optional<ReportError>*;
// False when the operation that failed had nothing to say but its status; the reason is a default text then.
bool KdReportErrorHasReason(const ReportError& error);
// "bad argument" and so on, for people; "status 0x00000007" for one that the library does not use.
[[nodiscard]] std::string KdReportCopyStatusText(KdStatus status);

// Where the lines go that the library says of drivers that fail among several; standard error until it is
// set, and again with an empty function. For the whole process, from any thread; the sink runs in the thread
// that reads, one line without line feed at a time, and must not call this operation.
using KdReportLogSink = std::function<void(std::string_view line)>;
void KdReportSetLogSink(KdReportLogSink sink);

// ---- Channels

// The record that a visitor was given, to hold on to.
[[nodiscard]] KdReportChannel KdReportRetainChannel(ChannelRecord& channel);

// The publishing driver's registry entry identifier, and the channel's own; kKdReportInvalid when missing.
std::int64_t KdReportChannelGetDriverID(const ChannelRecord* channel);
std::int64_t KdReportChannelGetChannelID(const ChannelRecord* channel);
// 0 when the type cannot be read.
std::uint8_t KdReportChannelGetFormat(const ChannelRecord* channel);
// A bit mask; kKdReportAllCategories when the type cannot be read.
std::uint16_t KdReportChannelGetCategories(const ChannelRecord* channel);
// Of its type, see ChannelType; 0 when the type cannot be read.
std::uint16_t KdReportChannelGetElementCount(const ChannelRecord* channel);
std::optional<std::string_view> KdReportChannelGetGroup(const ChannelRecord* channel);
std::optional<std::string_view> KdReportChannelGetSubGroup(const ChannelRecord* channel);
// As KdReportCopyDriverName makes it.
std::optional<std::string_view> KdReportChannelGetDriverName(const ChannelRecord* channel);
// The unit code, see KdReportScaleValue; kKdReportInvalid when the channel has none.
std::int64_t KdReportChannelGetUnit(const ChannelRecord* channel);
// The legend's name, else the printable characters of the identifier (0x54454D50 is TEMP), else none. Cached.
std::optional<std::string_view> KdReportChannelGetChannelName(const ChannelRecord* channel);
// A short text such as "ns"; empty for a plain count, none without a unit. Cached.
std::optional<std::string_view> KdReportChannelGetUnitLabel(const ChannelRecord* channel);

// ---- Collections

// A new empty collection that files what is added to it by `options`.
[[nodiscard]] KdReportCollection KdReportCreateAggregate(std::uint32_t options);

// A channel that no legend lists: builds its record and files it with the collection's own options.
//   kKdError: the identifier is kKdReportInvalid, the driver has no name, or the record cannot be filed;
//   kKdBadArgument: no collection.
struct KdReportChannelDescription {
  std::int64_t driverID = 0;
  KdReportOwnedText driverName = {};  // needed: a record always has one
  std::int64_t channelID = 0;
  ChannelType channelType = {};
  KdReportOwnedText channelName = {}, groupName = {}, subGroupName = {};
  // As KdReportCreateUnitInfo makes one; anything but a dictionary counts as none.
  PlistValue channelInfo = {};
};
[[nodiscard]] KdStatus KdReportAddChannelDescription(ChannelCollection* collection,
                                                     const KdReportChannelDescription& description,
                                                     KdReportErrorOut error = nullptr);

// What a visitor answers for a channel. Any odd value stops the walk, which then returns it.
enum KdReportVisit : std::uint32_t {
  kKdReportKeep = 0,
  kKdReportStop = 1,
  kKdReportRemove = 16,  // leave the channel out; when only visiting: no effect but the walk's status
};
// The walk's own failure: a null or malformed collection. Odd.
inline constexpr std::uint32_t kKdReportWalkFailed = 0x111;

using KdReportVisitor = std::function<std::uint32_t(ChannelRecord&)>;

// Calls the visitor for every channel at every level: those filed at the top first, then those per driver,
// then those per group. The visitor may change channels, but not the collection. Returns the bitwise OR of
// its answers, or the odd value that stopped the walk.
std::uint32_t KdReportIterate(const ChannelCollection* collection, const KdReportVisitor& visitor);
// The same, and removes in place the channels for which the visitor answers kKdReportRemove, with the levels
// that become empty. When the visitor throws, what it removed until then is gone, the rest stays in its
// order, and levels that became empty may stay.
std::uint32_t KdReportPrune(ChannelCollection* collection, const KdReportVisitor& visitor);
// The channels at all levels; kKdReportNoIndex for a null or malformed collection.
std::uint32_t KdReportGetChannelCount(const ChannelCollection* collection);
// Files every channel of `source`, the records themselves, into `destination` by the destination's options.
// Returns a walk's status: odd when a channel could not be filed, kKdReportWalkFailed for a malformed source
// (kKdError) and for a null collection or one merged into itself ("bad argument", kKdBadArgument). What was
// filed before a failure stays.
[[nodiscard]] std::uint32_t KdReportMergeChannels(ChannelCollection* destination,
                                                  const ChannelCollection* source,
                                                  KdReportErrorOut error = nullptr);

// A collection as a property list of dictionaries and arrays, to print or to keep; samples carry their
// elements.
[[nodiscard]] PlistValue KdReportCopyPropertyList(const ChannelCollection* collection);
// The way back. Null when the value is no dictionary or is nested deeper than a filed collection can be; what
// is malformed inside fails the walks that meet it, and does so after another way there and back.
[[nodiscard]] KdReportCollection KdReportCreateAggregateFromPropertyList(const PlistValue& value);

// ---- Discovery
//
// Each returns a new collection, or null with `error` filled. Drivers that do not publish their legend are
// passed over; one whose legend is bad is named on standard error where several are read.

// The channels of one driver, a registry entry. Reasons: "invalid driver" (kKdBadArgument), "no legend"
// (kKdNotFound), "bad legend" (kKdInternalError), else the default reason with the status.
[[nodiscard]] KdReportCollection KdReportCopyChannelsForDriver(DriverRegistry& registry, KdHandle driver,
                                                               std::uint32_t options,
                                                               KdReportErrorOut error = nullptr);
// The channels of every driver that a matching description matches; one that fails, fails all. kKdAborted
// when the registry changed meanwhile, "no matching dict" (kKdBadArgument) without a description.
[[nodiscard]] KdReportCollection KdReportCopyChannelsForDrivers(DriverRegistry& registry,
                                                                const PlistValue& matching,
                                                                std::uint32_t options,
                                                                KdReportErrorOut error = nullptr);
// The channels of every driver that publishes its legend.
[[nodiscard]] KdReportCollection KdReportCopyAllChannels(DriverRegistry& registry, std::uint32_t options,
                                                         KdReportErrorOut error = nullptr);
// For every driver matched, one channel with this identifier and a type that the first sampling finds out.
// Without a matching description: null and no error.
[[nodiscard]] KdReportCollection KdReportCopyChannelsWithID(DriverRegistry& registry,
                                                            const PlistValue& matching,
                                                            std::int64_t channelID,
                                                            KdReportErrorOut error = nullptr);
// "name <id 0x1000002a1>", or none when the entry has no name or no identifier.
[[nodiscard]] std::optional<std::string> KdReportCopyDriverName(DriverRegistry& registry, KdHandle driver);

// ---- Selection
//
// All public channels, narrowed. An empty selection is a success. Null as for KdReportCopyAllChannels, or
// with "channel pruning failed" (kKdError).

// Those with any category of the mask's low 16 bits; a channel whose type cannot be read has them all.
[[nodiscard]] KdReportCollection KdReportCopyChannelsInCategories(DriverRegistry& registry, std::int32_t mask,
                                                                  std::uint32_t options,
                                                                  KdReportErrorOut error = nullptr);
// Those of the format in the low 8 bits.
[[nodiscard]] KdReportCollection KdReportCopyChannelsOfFormat(DriverRegistry& registry, std::int32_t format,
                                                              std::uint32_t options,
                                                              KdReportErrorOut error = nullptr);
// Those of exactly this unit code; kKdReportInvalid selects the channels without one.
[[nodiscard]] KdReportCollection KdReportCopyChannelsWithUnit(DriverRegistry& registry, std::int64_t unit,
                                                              std::uint32_t options,
                                                              KdReportErrorOut error = nullptr);
// Those of the group, the subgroup or, with both, of both; names are compared whole. Neither: "no group or
// subgroup!" (kKdBadArgument).
[[nodiscard]] KdReportCollection KdReportCopyChannelsInGroup(DriverRegistry& registry, KdReportText group,
                                                             KdReportText subGroup, std::uint32_t options,
                                                             KdReportErrorOut error = nullptr);
// The same on a collection, in place. Returns 0, kKdReportRemove when something was removed, or 1 on failure.
[[nodiscard]] std::uint32_t KdReportSelectChannelsInGroup(ChannelCollection* collection, KdReportText group,
                                                          KdReportText subGroup,
                                                          KdReportErrorOut error = nullptr);

// ---- Subscription and samples

// Tells the kernel's hub which channels are wanted and maps the buffer in which it keeps their values. On
// success `subscribedChannels` receives a new collection, against which samples are taken. The subscription
// holds its connection and mapping until its last reference goes, and must not outlive the registry or, weak
// references included, the allocator; another set of channels needs another one. `allocator` holds the object
// (null: the default), `options` are not looked at. Null on failure, and nothing stays open:
//   "bad arguments", "iteration error", "no channels" (kKdBadArgument), "createInterestList() failed"
//   (kKdNoMemory), "Could not open KdReportHub", "kKdReportUserClientOpen failed",
//   "kKdReportUserClientConfigureInterests failed", "KdConnectMapMemory() failed" (the hub's status); without
//   a hub kKdNotFound, without a registry kKdNoMemory.
[[nodiscard]] std::shared_ptr<KdReportSubscription> KdReportCreateSubscription(
    DriverRegistry& registry, std::pmr::memory_resource* allocator, const ChannelCollection* channels,
    KdReportCollection* subscribedChannels, std::uint32_t options, KdReportErrorOut error = nullptr);

// Has the hub bring its buffer up to date and copies out of it: a new collection, filed like the subscribed
// one, whose channels carry their values of this moment. A channel that the buffer lacks is left out. Null on
// failure: kKdBadArgument for a null argument, the hub's status, or as for the raw form.
[[nodiscard]] KdReportCollection KdReportCreateSamples(KdReportSubscription* subscription,
                                                       const ChannelCollection* subscribedChannels,
                                                       KdReportErrorOut error = nullptr);

// The same from a buffer of 64-byte elements wherever it comes from; bytes behind the last whole element do
// not count. Null for fewer than 64 bytes (kKdBadArgument), or with "couldn't create samples" when an element
// that announces no length comes first or a channel was missing and the walk failed.
[[nodiscard]] KdReportCollection KdReportCreateSamplesRaw(const ChannelCollection* channels,
                                                          std::optional<std::span<const std::byte>> buffer,
                                                          KdReportErrorOut error = nullptr);

// Later minus earlier for one channel, as a new record that shares nothing writable with either. Null on
// failure: kKdBadArgument for an unknown format or "mismatched formats", "unknown report format"
// (kKdUnsupportedMode), kKdError for values that cannot be read, 1 for elements that do not fit the type.
[[nodiscard]] KdReportChannel KdReportSampleCreateDelta(const ChannelRecord* earlier,
                                                        const ChannelRecord* later,
                                                        KdReportErrorOut error = nullptr);
// The same for every channel of `later`. Channels pair in their order at each level; one of `later` without a
// partner is carried with its absolute values. Null when one delta fails or a level is missing in `earlier`.
[[nodiscard]] KdReportCollection KdReportCreateSamplesDelta(const ChannelCollection* earlier,
                                                            const ChannelCollection* later,
                                                            KdReportErrorOut error = nullptr);

// ---- Values, of channels in a sample or a delta
//
// 64-bit answers are kKdReportInvalid without elements of the format and for an element that is not there. It
// is the format that the elements carry: of a simple channel and an array it alone counts, whatever the
// channel's type says; states and buckets also need a type of their format that announces as many elements.

// Of a channel with exactly one element. `unit`, when wanted, receives the unit code.
std::int64_t KdReportSimpleGetIntegerValue(const ChannelRecord* channel, std::int64_t* unit = nullptr);
std::int64_t KdReportArrayGetValueAtIndex(const ChannelRecord* channel, std::int32_t index);
// The values that it carries, four to an element; kKdReportNoIndex when there is no array.
std::uint32_t KdReportArrayGetCount(const ChannelRecord* channel);

// kKdReportNoIndex when the channel is no histogram.
std::uint32_t KdReportHistogramGetBucketCount(const ChannelRecord* channel);
std::int64_t KdReportHistogramGetBucketHits(const ChannelRecord* channel, std::int32_t bucket);
std::int64_t KdReportHistogramGetBucketMinValue(const ChannelRecord* channel, std::int32_t bucket);
std::int64_t KdReportHistogramGetBucketMaxValue(const ChannelRecord* channel, std::int32_t bucket);
std::int64_t KdReportHistogramGetBucketSum(const ChannelRecord* channel, std::int32_t bucket);
// Of the lowest bucket with hits, and of the highest.
std::int64_t KdReportHistogramGetMinValue(const ChannelRecord* channel);
std::int64_t KdReportHistogramGetMaxValue(const ChannelRecord* channel);
// A bucket holds values from `lower` up to `upper`; the first begins at 0. kKdError for a bucket that the
// configuration does not describe, or a configuration whose bounds do not rise or outnumber the buckets.
// Cached.
[[nodiscard]] KdStatus KdReportHistogramGetBucketBounds(const ChannelRecord* channel, std::int32_t bucket,
                                                        std::int64_t* lower, std::int64_t* upper);
// The upper bounds that a configuration describes: segments of 16 bytes, each a base, whether its bounds are
// powers of the base or multiples, 32 bits that are not read, and its number of buckets (each 32 bits,
// little-endian). None when it has no segment, a bound does not lie above the one before it (the first above
// 0), or there are more than `mostBuckets`.
[[nodiscard]] std::optional<std::vector<std::int64_t>> KdReportCopyBucketBounds(
    std::span<const std::byte> config, std::size_t mostBuckets);

// kKdReportNoIndex when the channel is no state channel.
std::uint32_t KdReportStateGetCount(const ChannelRecord* channel);
std::int64_t KdReportStateGetIDForIndex(const ChannelRecord* channel, std::int32_t index);
std::int64_t KdReportStateGetInTransitions(const ChannelRecord* channel, std::int32_t index);
// In the channel's unit.
std::int64_t KdReportStateGetResidency(const ChannelRecord* channel, std::int32_t index);
// The highest index with this state identifier, or kKdReportNoIndex.
std::uint32_t KdReportStateGetIndexForID(const ChannelRecord* channel, std::int64_t id);
// The printable characters of the identifier; none for all states when one of them has none. Cached.
std::optional<std::string_view> KdReportStateGetNameForIndex(const ChannelRecord* channel,
                                                             std::int32_t index);
// The state's share of the time spent in all, 0 to 1; not a number when there is none.
double KdReportStateGetDutyCycle(const ChannelRecord* channel, std::int32_t index);
// That of each state, in one pass; empty when the channel is no state channel or its states cannot be read.
[[nodiscard]] std::vector<double> KdReportStateCopyDutyCycles(const ChannelRecord* channel);
// The state that was updated last, or kKdReportNoIndex.
std::uint32_t KdReportStateGetCurrent(const ChannelRecord* channel);

// ---- Units and texts

// What a unit code measures, in its upper 8 bits. Other quantities occur.
enum KdReportQuantity : std::uint8_t {
  kKdReportCount = 0,
  kKdReportTime = 1,          // s
  kKdReportPower = 2,         // W
  kKdReportEnergy = 3,        // J
  kKdReportCurrent = 4,       // A
  kKdReportVoltage = 5,       // V
  kKdReportCapacitance = 6,   // F
  kKdReportInductance = 7,    // H
  kKdReportFrequency = 8,     // Hz
  kKdReportInformation = 9,   // bits and bytes
  kKdReportTemperature = 10,  // C
  kKdReportEvents = 100,
  kKdReportPackets = 101,
};
// Seconds, unscaled.
inline constexpr std::int64_t kKdReportSeconds = 0x0100000000000000;

std::uint8_t KdReportUnitGetQuantity(std::int64_t unit);
// One of the unit is numerator / denominator of its quantity's base, in wrapping unsigned arithmetic.
// kKdBadArgument for ticks and pages of unknown size.
[[nodiscard]] KdStatus KdReportUnitGetScale(std::int64_t unit, std::uint64_t& numerator,
                                            std::uint64_t& denominator);
// "ns", "MiB", "events"; empty for a plain count, none for kKdReportInvalid.
[[nodiscard]] std::optional<std::string> KdReportCopyUnitLabel(std::int64_t unit);
// {"KdReportChannelUnit": unit}: a channel information for KdReportAddChannelDescription.
[[nodiscard]] PlistValue KdReportCreateUnitInfo(std::int64_t unit);
// The value in another unit of the same quantity. Not a number when the quantities differ or a scale is not
// numeric.
double KdReportScaleValue(std::uint64_t value, std::int64_t fromUnit, std::int64_t toUnit);
// One line about the channel, `prefix` first; none when its type cannot be read. `reserved` is not looked at.
[[nodiscard]] std::optional<std::string> KdReportChannelCopyDescription(const ChannelRecord* channel,
                                                                        std::uint64_t reserved,
                                                                        KdReportText prefix);
// A line for each element of a sampled channel; none when a value that belongs to it cannot be read.
[[nodiscard]] std::optional<std::string> KdReportSampleCopyDescription(const ChannelRecord* channel,
                                                                       std::uint64_t reserved,
                                                                       KdReportText prefix);
// Writes the text in one call that is not repeated: kKdBadArgument for none, kKdNoMemory for one that is no
// UTF-8, kKdIOError when the call fails, kKdUnderrun when it writes less.
[[nodiscard]] KdStatus KdReportWriteStringUTF8(int fd, KdReportText text);
// "name <pid 42>" of this process.
[[nodiscard]] std::string KdReportCopyCurrentProcessName();

}  // namespace kdreport

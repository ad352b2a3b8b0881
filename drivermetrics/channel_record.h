// The record of one channel, and what the library itself asks of it.
#pragma once

#include <atomic>
#include <utility>

#include "drivermetrics/kd_report.h"

namespace kdreport {

// A legend entry, [identifier, ChannelType, name (optional)]: its places as they came, which may hold values
// of any kind; absent ones lie behind its end.
struct LegendEntry {
  PlistValue channelID, channelType;  // numbers
  PlistValue channelName;             // string
};

// What the channels of a legend group have in common. Never changes once a record refers to it.
struct LegendGroup {
  PlistValue driverID;                 // number: the driver's registry entry identifier
  PlistValue driverName;               // string
  PlistValue groupName, subGroupName;  // strings
  PlistValue channelInfo;              // dictionary
};

// The type that a sampling found out for a channel whose legend does not know it. Read and set by any thread.
class FoundType {
 public:
  FoundType() = default;
  FoundType(const FoundType& other) : number_(other.number_.load(std::memory_order_relaxed)) {}
  FoundType& operator=(const FoundType&) = delete;

  std::optional<std::int64_t> get() const {
    const std::int64_t number = number_.load(std::memory_order_relaxed);
    return number != kKdReportInvalid ? std::optional(number) : std::nullopt;
  }
  void set(std::int64_t number) { number_.store(number, std::memory_order_relaxed); }

 private:
  std::atomic<std::int64_t> number_ = kKdReportInvalid;
};

// What a driver says of a channel. Every record that was copied from another refers to the same, so that a
// type that is found out shows in all of them.
struct ChannelSource {
  std::shared_ptr<const LegendGroup> group;  // never null
  std::optional<LegendEntry> legendChannel;  // none when it is missing or no array
  FoundType foundType;                       // in place of the entry's
};

// Answers that cost something, kept once they were asked for.
enum class CachedAnswer : std::uint8_t {
  ChannelName,             // string
  UnitLabel,               // string
  ProcessedChannelConfig,  // array of upper bucket bounds
  StateNames,              // array of strings
};

// The answers of a record, and of the copies that are made of it from then on. An answer that was kept stays
// until the last of these goes. Any thread may look up, keep and copy; of two that keep the same answer the
// first counts.
class AnswerCache {
 public:
  AnswerCache() = default;
  AnswerCache(const AnswerCache& other) : last_(retained(other.last_.load(std::memory_order_acquire))) {}
  AnswerCache& operator=(const AnswerCache&) = delete;
  ~AnswerCache() { release(last_.load(std::memory_order_acquire)); }

  // None when there is none. Borrowed.
  const PlistValue& find(CachedAnswer answer) const;
  // The answer that counts. A none value keeps nothing.
  const PlistValue& keep(CachedAnswer answer, PlistValue value);

 private:
  struct Kept;
  static const Kept* retained(const Kept* kept);
  static void release(const Kept* kept);

  std::atomic<const Kept*> last_ = nullptr;  // a list from the last answer to the first
};

// The bytes of a sampled channel's elements. Copies refer to the same bytes.
class ElementData {
 public:
  ElementData() = default;
  // A copy of the bytes.
  explicit ElementData(std::span<const std::byte> bytes);
  // Bytes in memory that is shared with those of other channels.
  ElementData(std::shared_ptr<std::byte[]> bytes, std::size_t size) : bytes_(std::move(bytes)), size_(size) {}

  explicit operator bool() const { return bytes_ != nullptr; }
  std::span<std::byte> bytes() const { return {bytes_.get(), size_}; }

 private:
  std::shared_ptr<std::byte[]> bytes_;  // none: no data
  std::size_t size_ = 0;
};

template <typename T>
struct ObjectBlock;

// A record is a dictionary with a fixed set of keys, held in members; an absent value is an absent key.
// Values that come from outside may be of any kind and are checked where they are read. Copies are small: a
// sample of many thousand channels is made of them.
class ChannelRecord {
 public:
  explicit ChannelRecord(std::shared_ptr<ChannelSource> of) : source(std::move(of)) {}
  ChannelRecord(const ChannelRecord& other)
      : source(other.source), rawElements(other.rawElements), answers_(other.answers_) {}
  ChannelRecord& operator=(const ChannelRecord&) = delete;

  const LegendGroup& group() const { return *source->group; }
  const PlistValue& cached(CachedAnswer answer) const { return answers_.find(answer); }
  const PlistValue& cache(CachedAnswer answer, PlistValue value) const {
    return answers_.keep(answer, std::move(value));
  }

  std::shared_ptr<ChannelSource> source;        // never null
  ElementData rawElements;                      // of samples only
  ObjectBlock<ChannelRecord>* block = nullptr;  // where it lies; a copy lies elsewhere

 private:
  mutable AnswerCache answers_;
};

// None unless the value is an array.
std::optional<LegendEntry> legendEntryOf(const PlistValue& value);

// The type of the legend entry, as it came or as it was found out; none without an entry.
PlistValue legendType(const ChannelSource& source);

// A number as the library reads it; kKdReportInvalid for anything else.
std::int64_t integerOrInvalid(const PlistValue& value);

// kKdError when the legend entry is missing or too short, or its type is no number.
KdStatus getChannelType(const ChannelRecord* channel, ChannelType& type);
// Changes the legend entry's type, for every record that shares it; kKdReportInvalid's bits stand for the
// entry's own. kKdError without an entry.
KdStatus setChannelType(ChannelRecord* channel, ChannelType type);

// The histogram bucket configuration of the channel information, borrowed; none when it has none.
std::optional<std::span<const std::byte>> getChannelConfig(const ChannelRecord* channel);

// The bytes of the identifier from the most significant on, without those that are zero; none when another is
// not printable or none is left.
std::optional<std::string> _copyPrintableIDString(std::int64_t identifier);

}  // namespace kdreport

// The record of one channel, and what the library itself asks of it.
#pragma once

#include <atomic>
#include <utility>
#include <vector>

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

struct SourceBlock;
class RecordBlock;
struct ElementBlock;

// What a driver says of a channel. Every record that was copied from another refers to the same, so that a
// type that is found out shows in all of them. It holds the numbers alone, which are what is read of many
// thousand channels in a row; the entry that they come from lies apart.
struct ChannelSource {
  // None when it is missing or no array.
  const std::optional<LegendEntry>& legendChannel() const;
  // The type as it was found out, else the entry's. None without an entry, or when its type is no number.
  std::optional<ChannelType> type() const {
    const std::int64_t number = foundType.get().value_or(legendType);
    if (number == kKdReportInvalid && !hasTypeNumber()) return std::nullopt;
    return ChannelType{static_cast<std::uint64_t>(number)};
  }

  SourceBlock* block;                  // where it lies
  std::int64_t channelID, legendType;  // the entry's, as integerOrInvalid reads them
  FoundType foundType;

 private:
  bool hasTypeNumber() const;
};

// Sources of one legend group.
struct SourceBlock : std::enable_shared_from_this<SourceBlock> {
  explicit SourceBlock(std::shared_ptr<const LegendGroup> of);

  std::shared_ptr<const LegendGroup> group;         // never null
  std::int64_t driverID;                            // the group's, as integerOrInvalid reads it
  std::vector<ChannelSource> objects;               // never grows beyond what it reserved: its objects stay
  std::vector<std::optional<LegendEntry>> entries;  // of the source at the same place
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
  AnswerCache(const AnswerCache&) = delete;
  AnswerCache& operator=(const AnswerCache&) = delete;
  ~AnswerCache() { release(last_.load(std::memory_order_acquire)); }

  // Takes over what another has; for one that is empty and that nobody else knows.
  void share(const AnswerCache& other) { last_ = retained(other.last_.load(std::memory_order_acquire)); }
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

// A record is a dictionary with a fixed set of keys, held in members; an absent value is an absent key.
// Values that come from outside may be of any kind and are checked where they are read. Records are small and
// count no references: a sample of many thousand channels is made of them. The block that a record lies in
// keeps alive what it refers to, and has its answers.
class ChannelRecord {
 public:
  ChannelRecord(ChannelSource& of, RecordBlock& in) : source(&of), block(&in) {}

  const LegendGroup& group() const { return *source->block->group; }
  std::int64_t driverID() const { return source->block->driverID; }
  std::int64_t channelID() const { return source->channelID; }
  std::uint8_t format() const {
    const auto type = source->type();
    return type ? type->format() : std::uint8_t{kKdReportUnknownFormat};
  }
  // Of samples only. Those that share them change with each other.
  bool hasElements() const { return elements_ != nullptr; }
  std::span<std::byte> elements() const { return {elements_, elementsSize_}; }
  // Refers to the same bytes as another record, if that has some.
  void shareElements(const ChannelRecord& other) {
    if (other.hasElements()) takeOver(other);
  }
  // Refers to bytes of the block.
  void setElements(std::byte* bytes, std::size_t size, ElementBlock& in);
  // Refers to a copy of the bytes.
  void copyElements(std::span<const std::byte> bytes);
  const PlistValue& cached(CachedAnswer answer) const;
  const PlistValue& cache(CachedAnswer answer, PlistValue value) const;

  ChannelSource* source;  // never null
  RecordBlock* block;     // where it lies

 private:
  void takeOver(const ChannelRecord& other);

  std::byte* elements_ = nullptr;  // in a block that this record's block keeps; none: no elements
  std::size_t elementsSize_ = 0;
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

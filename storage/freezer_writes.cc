#include "storage/freezer_writes.h"

#include <algorithm>
#include <cstdint>
#include <deque>
#include <new>

#include "platform/byte_reader.h"
#include "platform/stack_snapshot.h"

namespace tbdaily {

namespace {

constexpr std::string_view kFreezerThread = "VM_swapout";
constexpr std::uint64_t kKcdataFormat = 0x10000;     // snapshot flag
constexpr std::size_t kWrittenOffset = 24;           // in the I/O statistics: volume written to disk
constexpr std::size_t kMaximumNameLength = 64;       // of a thread
constexpr std::size_t kMinimumContainerPayload = 4;  // the container's type

enum : std::uint32_t {
  kContainerBegin = 0x13,
  kContainerEnd = 0x14,
  kIOStatistics = 0x901,
  kThreadName = 0x909,
  kBufferEnd = 0xF19158ED,
};

// 16 bytes, followed by the payload; the next item starts right behind that.
struct Item {
  std::uint32_t type = 0;
  std::uint64_t flags = 0;
  std::span<const std::byte> payload;

  bool beginsContainer() const {
    return type == kContainerBegin && payload.size() >= kMinimumContainerPayload;
  }
};

class KcdataCursor {
 public:
  explicit KcdataCursor(std::span<const std::byte> buffer) : buffer_(buffer) {}

  std::size_t offset() const { return offset_; }
  // Nothing when the item does not lie wholly inside the buffer.
  std::optional<Item> item() const {
    const std::span<const std::byte> rest = buffer_.subspan(offset_);
    const ByteReader header(rest);
    const auto type = header.at<std::uint32_t>(0);
    const auto size = header.at<std::uint32_t>(4);
    const auto flags = header.at<std::uint64_t>(8);
    if (!flags || *size > rest.size() - kHeaderSize) return std::nullopt;
    return Item{*type, *flags, rest.subspan(kHeaderSize, *size)};
  }
  // Behind an item of this buffer.
  void moveBehind(const Item& item) { offset_ += kHeaderSize + item.payload.size(); }

 private:
  static constexpr std::size_t kHeaderSize = 16;

  std::span<const std::byte> buffer_;
  std::size_t offset_ = 0;
};

// As much of the wanted name as the thread's name is long; a zero ends that early.
bool isNamed(std::span<const std::byte> threadName, std::string_view wanted) {
  const std::size_t length = std::min(threadName.size(), kMaximumNameLength);
  for (std::size_t i = 0; i < length; ++i) {
    const auto c = std::to_integer<unsigned char>(threadName[i]);
    const auto expected = static_cast<unsigned char>(i < wanted.size() ? wanted[i] : '\0');
    if (c != expected) return false;
    if (c == 0) return true;
  }
  return true;
}

// One pass, with the containers that are open on a stack of its own: they may be nested as deep as the buffer
// is long. The stack takes at most twice the memory of the buffer, and is never copied.
class ThreadSearch {
 public:
  ThreadSearch(std::span<const std::byte> buffer, std::string_view threadName)
      : cursor_(buffer), threadName_(threadName) {}

  std::size_t offset() const { return cursor_.offset(); }
  const KcdataIOStats& ioStats() const { return open_.back().ioStats; }

  bool run() {
    if (!enterFirstContainer()) return false;
    while (true) {
      const std::optional<Item> item = cursor_.item();
      const bool isLast = !item || item->type == kBufferEnd;
      if (isLast || closesInnermost(*item)) {
        if (open_.back().nameMatches) return true;
        open_.pop_back();
        if (open_.empty()) return false;
        // Each container that is open ends at an item that does not fit; a buffer end ends only one.
        if (!item) continue;
      } else if (item->beginsContainer()) {
        open_.push_back({item->flags, {}, false});
      } else {
        note(*item);
      }
      cursor_.moveBehind(*item);
    }
  }

 private:
  struct Container {
    std::uint64_t identifier = 0;
    KcdataIOStats ioStats;
    bool nameMatches = false;
  };

  bool enterFirstContainer() {
    while (const std::optional<Item> item = cursor_.item()) {
      if (item->type == kBufferEnd) return false;
      if (item->beginsContainer()) {
        open_.push_back({item->flags, {}, false});
        cursor_.moveBehind(*item);
        return true;
      }
      cursor_.moveBehind(*item);
    }
    return false;
  }

  bool closesInnermost(const Item& item) const {
    return item.type == kContainerEnd && item.flags == open_.back().identifier;
  }

  void note(const Item& item) {
    if (item.type == kThreadName) open_.back().nameMatches = isNamed(item.payload, threadName_);
    if (item.type == kIOStatistics) open_.back().ioStats = item.payload;
  }

  KcdataCursor cursor_;
  std::string_view threadName_;
  std::deque<Container> open_;  // the innermost last
};

// The volume that the thread has written, or nothing without a snapshot or the thread in it.
std::optional<std::uint64_t> freezerWrites(StackSnapshot& snapshots) {
  const auto configuration = snapshots.createConfiguration();
  if (!configuration || configuration->setFlags(kKcdataFormat) != kKdSuccess ||
      configuration->capture() != kKdSuccess)
    return std::nullopt;
  const auto buffer = configuration->buffer();
  if (!buffer) return std::nullopt;
  const std::size_t size = std::min<std::size_t>(configuration->size(), buffer->size());
  KcdataIOStats ioStats;
  if (!getIOStatsWithThreadnameFromKCData(buffer->first(size), kFreezerThread, ioStats)) return std::nullopt;
  return ioStats ? ByteReader(*ioStats).at<std::uint64_t>(kWrittenOffset).value_or(0) : 0;
}

}  // namespace

PlistDictionary CopyVMFreezerNANDInfo(Platform& platform) {
  PlistDictionary info;
  if (const auto writes = freezerWrites(platform.stackSnapshot)) {
    info.set(kNANDInfoVMFreezerNumPhysicalWritesKey, PlistValue::int64(static_cast<std::int64_t>(*writes)));
    return info;
  }
  info.set(kNANDInfoVMFreezerErrorKey, PlistValue::string("1"));
  info.set(kNANDInfoVMFreezerErrorMessageKey,
           PlistValue::string("Unable parse snapshot for VMFreezer NAND writes."));
  return info;
}

bool getIOStatsWithThreadnameFromKCDataHelper(std::span<const std::byte> buffer, std::string_view threadName,
                                              KcdataIOStats& ioStats, std::size_t* cursor) {
  bool isFound = false;
  std::size_t stoppedAt = 0;
  try {
    ThreadSearch search(buffer, threadName);
    isFound = threadName.data() != nullptr && search.run();
    stoppedAt = search.offset();
    if (isFound) ioStats = search.ioStats();
  } catch (const std::bad_alloc&) {
    // More open containers than there is memory for: the thread counts as not found.
  }
  if (cursor != nullptr) *cursor = stoppedAt;
  return isFound;
}

bool getIOStatsWithThreadnameFromKCData(std::span<const std::byte> buffer, std::string_view threadName,
                                        KcdataIOStats& ioStats) {
  return getIOStatsWithThreadnameFromKCDataHelper(buffer, threadName, ioStats, nullptr);
}

}  // namespace tbdaily

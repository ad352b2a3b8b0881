// Memory for what collections of many thousand channels are made of: many objects to an allocation, in the
// order in which they are made and will be walked, with one owner count. A block lives as long as one of its
// objects is referred to.
#pragma once

#include <cstring>
#include <functional>
#include <memory>
#include <vector>

#include "drivermetrics/channel_record.h"
#include "drivermetrics/load_ahead.h"

namespace kdreport {

// Keeps alive the blocks into which something refers, asked for reference by reference. Neighbours mostly
// refer into the same block, which is kept once.
template <typename Block>
class KeptBlocks {
 public:
  void keep(Block& block) {
    if (last_.get() != &block) keepAnother(block);
  }

  // The block of which the predicate holds; null when there is none.
  template <typename Predicate>
  Block* find(const Predicate& isWanted) const {
    if (last_ != nullptr && isWanted(*last_)) return last_.get();
    for (const std::shared_ptr<Block>& block : earlier_) {
      if (isWanted(*block)) return block.get();
    }
    return nullptr;
  }

  // Lets go of blocks. The predicate is asked in the order in which they came.
  template <typename Predicate>
  void removeIf(const Predicate& isRemoved) {
    std::erase_if(earlier_, [&isRemoved](const auto& block) { return isRemoved(*block); });
    if (last_ == nullptr || !isRemoved(*last_)) return;
    last_ = nullptr;
    if (earlier_.empty()) return;
    last_ = std::move(earlier_.back());
    earlier_.pop_back();
  }

 private:
  void keepAnother(Block& block);

  std::shared_ptr<Block> last_;
  std::vector<std::shared_ptr<Block>> earlier_;
};

// Elements of channels.
struct ElementBlock : std::enable_shared_from_this<ElementBlock> {
  explicit ElementBlock(std::size_t of) : bytes(std::make_unique_for_overwrite<std::byte[]>(of)), size(of) {}

  // Empty elements may begin at the end of a block.
  bool holds(const std::byte* place) const {
    return !std::less<>()(place, bytes.get()) && !std::less<>()(bytes.get() + size, place);
  }

  std::unique_ptr<std::byte[]> bytes;
  std::size_t size;
};

// Records, with what they refer to and what is cached of them.
class RecordBlock : public std::enable_shared_from_this<RecordBlock> {
 public:
  RecordBlock() = default;
  RecordBlock(const RecordBlock&) = delete;
  RecordBlock& operator=(const RecordBlock&) = delete;
  ~RecordBlock() { delete[] answers_.load(std::memory_order_acquire); }

  bool hasAnswers() const { return answers_.load(std::memory_order_relaxed) != nullptr; }
  // Null while no record of the block has any.
  AnswerCache* answersOf(const ChannelRecord& record) const;
  AnswerCache& makeAnswersOf(const ChannelRecord& record);

  std::vector<ChannelRecord> objects;  // never grows beyond what it reserved: its objects stay
  KeptBlocks<SourceBlock> sources;
  KeptBlocks<ElementBlock> elements;

 private:
  std::atomic<AnswerCache*> answers_ = nullptr;  // of each place that the block has; made with the first
};

inline void ChannelRecord::setElements(std::byte* bytes, std::size_t size, ElementBlock& in) {
  block->elements.keep(in);
  elements_ = bytes;
  elementsSize_ = size;
}

// Makes blocks one after the other as objects are added to them, each larger than the one before.
template <typename Block>
class Blocks {
 public:
  // So many more objects will be asked for at least, or about as many.
  void expect(std::size_t objects) { expected_ = objects; }

 protected:
  // The block for the next object, which has room for it.
  template <typename... Of>
  Block& next(const Of&... of) {
    if (block_ == nullptr || block_->objects.size() == block_->objects.capacity())
      begin(std::make_shared<Block>(of...));
    return *block_;
  }

 private:
  static constexpr std::size_t kMostInBlock = 256;

  void begin(std::shared_ptr<Block> block);

  std::size_t expected_ = 0, size_ = 0;
  std::shared_ptr<Block> block_;
};

class SourceBlocks : public Blocks<SourceBlock> {
 public:
  explicit SourceBlocks(std::shared_ptr<const LegendGroup> group) : group_(std::move(group)) {}

  // Lives as long as these blocks, or a record that refers to it.
  ChannelSource& add(std::optional<LegendEntry> entry) {
    SourceBlock& block = next(group_);
    const ChannelSource source{&block, entry ? integerOrInvalid(entry->channelID) : kKdReportInvalid,
                               entry ? integerOrInvalid(entry->channelType) : kKdReportInvalid, FoundType()};
    block.entries.push_back(std::move(entry));
    return block.objects.emplace_back(source);
  }

 private:
  std::shared_ptr<const LegendGroup> group_;
};

class RecordBlocks : public Blocks<RecordBlock> {
 public:
  // A record of the source. Lives as long as these blocks, or until nobody retains it.
  ChannelRecord& add(ChannelSource& source) {
    RecordBlock& block = next();
    block.sources.keep(*source.block);
    return block.objects.emplace_back(source, block);
  }
  // A copy of the record, without its elements.
  ChannelRecord& add(const ChannelRecord& of) {
    ChannelRecord& record = add(*of.source);
    if (of.block->hasAnswers()) record.block->makeAnswersOf(record).share(*of.block->answersOf(of));
    return record;
  }
};

class ElementBlocks {
 public:
  // Gives the record a copy of the bytes.
  void copy(std::span<const std::byte> bytes, ChannelRecord& record) {
    if (block_ == nullptr || bytes.size() > free_.size()) begin(bytes.size());
    const auto place = free_.first(bytes.size());
    free_ = free_.subspan(bytes.size());
    loadAhead(place.data(), bytes.size());
    std::memcpy(place.data(), bytes.data(), bytes.size());
    record.setElements(place.data(), place.size(), *block_);
  }

 private:
  static constexpr std::size_t kSmallestBlock = 1024, kLargestBlock = 65536;

  void begin(std::size_t atLeast);

  std::shared_ptr<ElementBlock> block_;
  std::size_t size_ = 0;
  std::span<std::byte> free_;  // what is left of the block
};

}  // namespace kdreport

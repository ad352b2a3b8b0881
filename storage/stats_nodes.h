// The values of a statistics buffer, read where they lie.
//
// The buffer is a gapless sequence of records of little-endian 64-bit words: a header (bits 0 to 31 the
// statistic's identifier, bits 32 to 63 the number n of values) and n values.
#pragma once

#include <cstddef>
#include <cstdint>
#include <iterator>
#include <limits>
#include <span>
#include <string>
#include <string_view>

#include "platform/byte_reader.h"
#include "storage/stats_table.h"

namespace tbdaily {

// The header of a record.
struct StatRecordHeader {
  std::uint32_t id = 0;
  std::uint32_t values = 0;
};

// The whole words of a buffer.
class StatWords {
 public:
  StatWords() = default;
  explicit StatWords(std::span<const std::byte> buffer) : bytes_(buffer) {}

  std::size_t size() const { return bytes_.size() / kSize; }
  // 0 outside.
  std::uint64_t operator[](std::size_t index) const {
    return ByteReader(bytes_).at<std::uint64_t>(index * kSize).value_or(0);
  }
  // The index is below size().
  StatRecordHeader headerAt(std::size_t index) const {
    const ByteReader word(bytes_.subspan(index * kSize, kSize));
    return {*word.at<std::uint32_t>(0), *word.at<std::uint32_t>(sizeof(std::uint32_t))};
  }
  // Asks the memory for a word that will be read soon.
  void prefetch(std::size_t index) const {
    if (index < size()) __builtin_prefetch(bytes_.data() + index * kSize);
  }
  StatWords first(std::size_t count) const { return StatWords(bytes_.first(count * kSize)); }

 private:
  static constexpr std::size_t kSize = sizeof(std::uint64_t);

  std::span<const std::byte> bytes_;
};

// One listed value. Its name is that of a statistic, followed by the element's index in decimal when the
// record contributed more than one value; it is composed when asked for, since a buffer may list millions of
// values.
struct StatNode {
  static constexpr std::uint16_t kBareName = std::numeric_limits<std::uint16_t>::max();

  std::uint64_t value = 0;
  std::uint16_t row = 0;  // of kStats
  std::uint16_t element = kBareName;

  std::string name() const;
  bool isNamed(std::string_view name) const;  // without an allocation
  // The value in unsigned decimal.
  std::string text() const { return std::to_string(value); }
};

// Every recognised value of a sequence of whole records, in their order. Borrows the words: a node is made
// when it is reached, so a list takes no memory however long it is.
class StatNodes {
 public:
  class Iterator {
   public:
    using value_type = StatNode;
    using difference_type = std::ptrdiff_t;

    Iterator() = default;
    explicit Iterator(const StatWords& records) : words_(records) { enterNextRecord(); }

    StatNode operator*() const {
      return {words_[first_ + element_], row_, count_ == 1 ? StatNode::kBareName : element_};
    }
    Iterator& operator++() {
      if (++element_ == count_) enterNextRecord();
      return *this;
    }
    Iterator operator++(int) {
      const Iterator before = *this;
      ++*this;
      return before;
    }
    friend bool operator==(const Iterator& at, std::default_sentinel_t) { return at.count_ == 0; }

   private:
    // The next one that lists values; none are left at the end.
    void enterNextRecord() {
      element_ = 0;
      count_ = 0;
      while (count_ == 0 && next_ < words_.size()) {
        const StatRecordHeader header = words_.headerAt(next_);
        first_ = next_ + 1;
        next_ = first_ + header.values;
        if (const auto row = findStat(header.id)) {
          row_ = *row;
          count_ = takenValues(*row, header.values);
        }
      }
    }

    StatWords words_;
    std::size_t next_ = 0;   // the header of the record behind this one
    std::size_t first_ = 0;  // the first value
    std::uint16_t row_ = 0, count_ = 0, element_ = 0;
  };

  StatNodes() = default;
  // `size` is how many values the records list.
  StatNodes(const StatWords& records, std::size_t size) : records_(records), size_(size) {}

  Iterator begin() const { return Iterator(records_); }
  static std::default_sentinel_t end() { return {}; }
  std::size_t size() const { return size_; }
  bool empty() const { return size_ == 0; }

 private:
  StatWords records_;
  std::size_t size_ = 0;
};

}  // namespace tbdaily

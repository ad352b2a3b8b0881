// Memory for what collections of many thousand channels are made of: many objects to an allocation, in the
// order in which they are made and will be walked, with one owner count. A block lives as long as one of its
// objects is referred to.
#pragma once

#include <algorithm>
#include <vector>

#include "drivermetrics/channel_record.h"

namespace tbdaily {

template <typename T>
class ObjectBlocks {
 public:
  // So many objects will be asked for, or another number.
  explicit ObjectBlocks(std::size_t expected) : expected_(expected) {}

  std::shared_ptr<T> add(T object) {
    if (block_ == nullptr || block_->size() == block_->capacity()) {
      block_ = std::make_shared<std::vector<T>>();
      block_->reserve(std::clamp<std::size_t>(expected_ - std::min(made_, expected_), 1, kMostInBlock));
    }
    ++made_;
    block_->push_back(std::move(object));
    return {block_, &block_->back()};
  }

 private:
  static constexpr std::size_t kMostInBlock = 256;

  std::size_t expected_, made_ = 0;
  std::shared_ptr<std::vector<T>> block_;  // never grows beyond what it reserved: its objects stay
};

class ElementBlocks {
 public:
  ElementData copy(std::span<const std::byte> bytes) {
    if (bytes.size() > size_ - used_) {
      size_ = std::max(std::clamp(size_ * 2, kSmallestBlock, kLargestBlock), bytes.size());
      block_ = std::make_shared_for_overwrite<std::byte[]>(size_);
      used_ = 0;
    }
    std::byte* place = block_.get() + used_;
    used_ += bytes.size();
    std::ranges::copy(bytes, place);
    return {std::shared_ptr<std::byte[]>(block_, place), bytes.size()};
  }

 private:
  static constexpr std::size_t kSmallestBlock = 1024, kLargestBlock = 65536;

  std::shared_ptr<std::byte[]> block_;
  std::size_t size_ = 0, used_ = 0;
};

}  // namespace tbdaily

// Memory for what collections of many thousand channels are made of: many objects to an allocation, in the
// order in which they are made and will be walked, with one owner count. A block lives as long as one of its
// objects is referred to.
#pragma once

#include <algorithm>
#include <vector>

#include "drivermetrics/channel_record.h"

namespace kdreport {

template <typename T>
struct ObjectBlock : std::enable_shared_from_this<ObjectBlock<T>> {
  std::vector<T> objects;  // never grows beyond what it reserved: its objects stay
};

template <typename T>
class ObjectBlocks {
 public:
  // So many objects will be asked for, or another number.
  explicit ObjectBlocks(std::size_t expected) : expected_(expected) {}

  template <typename From>
  std::shared_ptr<T> add(From&& from) {
    if (block_ == nullptr || block_->objects.size() == block_->objects.capacity()) {
      block_ = std::make_shared<ObjectBlock<T>>();
      block_->objects.reserve(
          std::clamp<std::size_t>(expected_ - std::min(made_, expected_), 1, kMostInBlock));
    }
    ++made_;
    T& object = block_->objects.emplace_back(std::forward<From>(from));
    if constexpr (requires { object.block; }) object.block = block_.get();
    return {block_, &object};
  }

 private:
  static constexpr std::size_t kMostInBlock = 256;

  std::size_t expected_, made_ = 0;
  std::shared_ptr<ObjectBlock<T>> block_;
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

}  // namespace kdreport

// Memory that a driver fills.
#pragma once

#include <cstddef>
#include <memory>
#include <span>

namespace tbdaily {

// A page-aligned buffer that a driver fills. Its bytes are indeterminate until then, and stay where they are
// when the buffer is moved.
class StorageBuffer {
 public:
  StorageBuffer() = default;  // without memory
  // No memory: a buffer that is false.
  explicit StorageBuffer(std::size_t size);

  explicit operator bool() const { return memory_ != nullptr; }
  std::span<std::byte> all() { return {memory_.get(), size_}; }
  // What the last fetch filled; only these bytes may be read.
  std::span<const std::byte> filled() const { return {memory_.get(), filled_}; }
  // More than the buffer holds counts as all of it.
  void setFilled(std::size_t size) { filled_ = size < size_ ? size : size_; }

 private:
  struct Release {
    void operator()(std::byte* memory) const;
  };
  std::unique_ptr<std::byte, Release> memory_;
  std::size_t size_ = 0;
  std::size_t filled_ = 0;
};

}  // namespace tbdaily

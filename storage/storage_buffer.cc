#include "storage/storage_buffer.h"

#include <new>

namespace tbdaily {

namespace {

// A multiple of every page size in use.
constexpr auto kPageAlignment = static_cast<std::align_val_t>(65536);

}  // namespace

StorageBuffer::StorageBuffer(std::size_t size)
    : memory_(static_cast<std::byte*>(::operator new(size, kPageAlignment, std::nothrow))), size_(size) {}

void StorageBuffer::Release::operator()(std::byte* memory) const {
  ::operator delete(memory, kPageAlignment);
}

}  // namespace tbdaily

#include "testing/allocations.h"

#include <cstdlib>
#include <new>

namespace {

constexpr std::size_t kNever = 0;
thread_local std::size_t taken = 0;
thread_local std::size_t refusedAt = kNever;

}  // namespace

[[gnu::noinline]] void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
  return ++taken == refusedAt ? nullptr : std::malloc(size != 0 ? size : 1);
}
[[gnu::noinline]] void* operator new(std::size_t size) {
  void* memory = ::operator new(size, std::nothrow);
  if (memory == nullptr) throw std::bad_alloc();
  return memory;
}
[[gnu::noinline]] void operator delete(void* memory) noexcept {
  std::free(memory);
}
[[gnu::noinline]] void operator delete(void* memory, std::size_t) noexcept {
  std::free(memory);
}

namespace tbdaily::testing {

std::size_t allocations() {
  return taken;
}

RefusedAllocation::RefusedAllocation(std::size_t n) : at_(taken + n) {
  refusedAt = at_;
}
RefusedAllocation::~RefusedAllocation() {
  refusedAt = kNever;
}
bool RefusedAllocation::wasMet() const {
  return taken >= at_;
}

}  // namespace tbdaily::testing

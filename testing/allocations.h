// What a test's program takes from the heap, thread by thread: counted, and refused where the test asks for
// it.
#pragma once

#include <cstddef>

namespace tbdaily::testing {

// Of this thread, since it began.
std::size_t allocations();

// While it lives, the n-th allocation (from 1) of this thread from now on fails. One at a
// time.
class RefusedAllocation {
 public:
  explicit RefusedAllocation(std::size_t n);
  ~RefusedAllocation();
  RefusedAllocation(const RefusedAllocation&) = delete;
  RefusedAllocation& operator=(const RefusedAllocation&) = delete;
  bool wasMet() const;

 private:
  const std::size_t at_;
};

}  // namespace tbdaily::testing

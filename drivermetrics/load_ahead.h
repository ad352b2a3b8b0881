// Asking for memory before it is read.
#pragma once

#include <cstddef>
#include <cstdint>

namespace kdreport {

// Where objects lie one behind the other, begins to load the one that lies eight places behind this one. In a
// walk through many thousand, which no cache holds, it is there when its turn comes. The memory need not be
// there: then nothing happens.
inline void loadAhead(const void* object, std::size_t size) {
  constexpr std::size_t kPlaces = 8;
  const std::uintptr_t place = reinterpret_cast<std::uintptr_t>(object) + kPlaces * size;
  // NOLINTNEXTLINE(performance-no-int-to-ptr): computed as a pointer it would have to point to an object
  __builtin_prefetch(reinterpret_cast<const void*>(place));
}
template <typename T>
void loadAhead(const T* object) {
  loadAhead(object, sizeof(T));
}

}  // namespace kdreport

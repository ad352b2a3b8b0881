// Asking for memory before it is read.
#pragma once

#include <cstdint>

namespace kdreport {

// Where objects lie one behind the other, begins to load the one that lies eight places behind this one. In a
// walk through many thousand, which no cache holds, it is there when its turn comes. The memory need not be
// there: then nothing happens.
inline void loadAhead(const void* object, std::size_t size) {
  constexpr std::size_t kPlaces = 8;
  __builtin_prefetch(
      reinterpret_cast<const void*>(reinterpret_cast<std::uintptr_t>(object) + kPlaces * size));
}
template <typename T>
void loadAhead(const T* object) {
  loadAhead(object, sizeof(T));
}

}  // namespace kdreport

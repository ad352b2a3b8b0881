// Libraries that are bound at run time.
//
// Absent: no library can be opened.
#pragma once

#include <string>
#include <string_view>

namespace tbdaily {

// An opened library, never closed; null is none.
using LibraryHandle = void*;

class DynamicLoader {
 public:
  virtual ~DynamicLoader() = default;
  // Binds lazily, with local visibility. `path` is absolute, as the device sees it.
  virtual LibraryHandle open(std::string_view path) = 0;
  // Null when the library has no such symbol.
  virtual void* symbol(LibraryHandle library, const std::string& name) = 0;
};

}  // namespace tbdaily

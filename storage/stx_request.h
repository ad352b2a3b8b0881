// The input structure of every size query and data fetch: 24 bytes, little-endian.
//
//   0  u32       command code
//   4  u16       flags: bit 0 size query, bit 1 extended, bits 2 to 9 index of the sub-list
//   6  18 bytes  zero
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

#include "storage/selectors.h"

namespace tbdaily {

// Which variant of a buffer is meant.
struct StxRequestOptions {
  std::uint16_t list = 0;  // sub-list; its low 8 bits travel
  bool extended = false;   // the caller's extended flag
};

struct StxRequest {
  std::uint32_t command = 0;
  std::uint16_t flags = 0;

  static StxRequest sizeQuery(const STXSelectorPair& selectors, const StxRequestOptions& options = {});
  static StxRequest dataFetch(const STXSelectorPair& selectors, const StxRequestOptions& options = {});

  std::array<std::byte, 24> bytes() const;
};

}  // namespace tbdaily

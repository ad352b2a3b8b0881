// What the built-in metrics ask of the analytics store's surroundings, handed in by whoever runs the report.
#pragma once

#include <cstdint>
#include <functional>

namespace tbdaily {

struct StoreProbes {
  std::function<std::int64_t()> databaseSizeMB;       // in whole MiB; -1 when it cannot be examined
  std::function<std::int64_t()> takeCorruptionCount;  // how often it was found damaged; counts from 0 again
};

}  // namespace tbdaily

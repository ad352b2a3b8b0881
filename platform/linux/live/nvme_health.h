// The SMART / health log page of an NVMe controller: log identifier 2, 512 bytes.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string_view>

#include "platform/linux/live/live_channels.h"

namespace tbdaily {

inline constexpr std::size_t kNvmeHealthSize = 512;
using NvmeHealthPage = std::array<std::byte, kNvmeHealthSize>;

// A figure of the page, `width` bytes, little-endian, times a factor and plus an offset.
struct NvmeFigure {
  std::string_view name;
  std::size_t at, width;
  LiveUnit unit;
  std::int64_t factor = 1, offset = 0;
};
// Those of one unit stand together.
extern const std::array<NvmeFigure, 15> kNvmeFigures;

// Held at the largest number where it is larger. Nothing for a temperature of 0 kelvin: it is not measured.
std::optional<std::int64_t> nvmeFigure(const NvmeFigure& figure,
                                       std::span<const std::byte, kNvmeHealthSize> page);

// Reads a controller's page through the kernel: 0 or an errno value. Waits at most 2 seconds.
int readNvmeHealth(int controller, NvmeHealthPage& page);

}  // namespace tbdaily

// Kernel stack snapshots in the kernel's kcdata format.
//
// Absent facility: capture fails.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>

#include "platform/status.h"

namespace tbdaily {

// One snapshot configuration; its destructor releases it and the captured buffer.
class StackSnapshotConfiguration {
 public:
  virtual ~StackSnapshotConfiguration() = default;
  virtual KdStatus setFlags(std::uint64_t flags) = 0;
  virtual KdStatus capture() = 0;
  // The captured bytes, or nothing before a successful capture. Borrowed until the configuration is released.
  virtual std::optional<std::span<const std::byte>> buffer() = 0;
  virtual std::uint32_t size() = 0;
};

class StackSnapshot {
 public:
  virtual ~StackSnapshot() = default;
  // Null when the facility is absent.
  virtual std::unique_ptr<StackSnapshotConfiguration> createConfiguration() = 0;
};

}  // namespace tbdaily

// Kernel values: sysctls, the processor's tick counter, the time, the process itself.
//
// Absent: every sysctl fails with ENOENT, the tick count is 0, there is no timebase, the time is
// 1970-01-01T00:00:00Z.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "platform/plist_value.h"

namespace tbdaily {

struct Timebase {  // ticks times numerator over denominator are nanoseconds
  std::uint32_t numerator = 0;
  std::uint32_t denominator = 0;
};

class Kernel {
 public:
  virtual ~Kernel() = default;

  // Reads the value into the buffer. `length` is at most the size of `buffer`: on entry the room there, on
  // success the bytes filled. Answers 0 or an errno value.
  virtual int sysctlByName(std::string_view name, std::span<std::byte> buffer, std::size_t& length) = 0;
  // Monotonic since boot; does not advance while the device sleeps.
  virtual std::uint64_t tickCount() = 0;
  virtual std::optional<Timebase> timebase() = 0;
  virtual PlistDate currentTime() = 0;
  virtual std::string processName() = 0;
  virtual std::int32_t processIdentifier() = 0;
};

}  // namespace tbdaily

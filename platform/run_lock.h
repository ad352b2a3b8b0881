// One run of the daily tasks at a time on a device, whichever process runs them.
#pragma once

#include <chrono>
#include <memory>

namespace tbdaily {

// The right to run them, until it is destroyed.
class HeldRunLock {
 public:
  virtual ~HeldRunLock() = default;
};

class RunLock {
 public:
  virtual ~RunLock() = default;
  // Waits for another run to end, for at most `patience`. Null when it did not, or when no lock can be had;
  // the implementation has said why on standard error.
  virtual std::unique_ptr<HeldRunLock> acquire(std::chrono::seconds patience) = 0;
};

}  // namespace tbdaily

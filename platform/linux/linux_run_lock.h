// The lock of a run: var/run/tbdaily.lock.
#pragma once

#include "platform/linux/base/host.h"
#include "platform/run_lock.h"

namespace tbdaily {

// Whoever holds the lock has the passing files of killed processes removed first.
class LinuxRunLock : public RunLock {
 public:
  explicit LinuxRunLock(const Host& host) : host_(host) {}
  std::unique_ptr<HeldRunLock> acquire(std::chrono::seconds patience) override;

 private:
  const Host& host_;
};

}  // namespace tbdaily

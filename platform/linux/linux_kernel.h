// Kernel values from recordings, else from the running kernel.
#pragma once

#include <mutex>
#include <optional>

#include "platform/kernel.h"
#include "platform/linux/replay/recordings.h"

namespace tbdaily {

class LinuxKernel : public Kernel {
 public:
  LinuxKernel(const Host& host, Recordings& recordings) : host_(host), recordings_(recordings) {}

  int sysctlByName(std::string_view name, std::span<std::byte> buffer, std::size_t& length) override;
  std::uint64_t tickCount() override;
  std::optional<Timebase> timebase() override;
  // Throws std::runtime_error where the time is recorded and was never readable: a guess would be a wrong
  // day.
  PlistDate currentTime() override;
  std::string processName() override;
  std::int32_t processIdentifier() override;

 private:
  std::optional<PlistDate> recordedNow();
  int nextEccEvent(std::span<std::byte> buffer, std::size_t& length);
  int recordedErrno(std::string_view name);

  const Host& host_;
  Recordings& recordings_;
  std::size_t eccEventsRead_ = 0;
  std::mutex mutex_;                      // a usage reply is processed on a thread of its own
  std::optional<PlistDate> recordedNow_;  // when last read
};

}  // namespace tbdaily

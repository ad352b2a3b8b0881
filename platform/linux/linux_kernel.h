// Kernel values from recordings, else from the running kernel.
#pragma once

#include "platform/kernel.h"
#include "platform/linux/replay/recordings.h"

namespace tbdaily {

class LinuxKernel : public Kernel {
 public:
  LinuxKernel(const Host& host, Recordings& recordings) : host_(host), recordings_(recordings) {}

  int sysctlByName(std::string_view name, std::span<std::byte> buffer, std::size_t& length) override;
  std::uint64_t tickCount() override;
  std::optional<Timebase> timebase() override;
  PlistDate currentTime() override;
  std::string processName() override;
  std::int32_t processIdentifier() override;

 private:
  int nextEccEvent(std::span<std::byte> buffer, std::size_t& length);
  int recordedErrno(std::string_view name);

  const Host& host_;
  Recordings& recordings_;
  std::size_t eccEventsRead_ = 0;
};

}  // namespace tbdaily

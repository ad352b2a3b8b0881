// Every service family on a Linux host, over one device root.
#pragma once

#include <memory>

#include "platform/linux/base/host.h"
#include "platform/platform.h"

namespace tbdaily {

class LinuxPlatform {
 public:
  explicit LinuxPlatform(Host host);
  ~LinuxPlatform();
  LinuxPlatform(const LinuxPlatform&) = delete;
  LinuxPlatform& operator=(const LinuxPlatform&) = delete;

  const Host& host() const;
  Platform& services();

 private:
  struct Families;
  std::unique_ptr<Families> families_;
};

}  // namespace tbdaily

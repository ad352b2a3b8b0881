// The driver registry of a device on a Linux host: a recorded one, else, where live sources are on, the
// host's own.
#pragma once

#include <memory>
#include <mutex>

#include "platform/linux/base/host.h"
#include "platform/linux/live/live_host.h"
#include "platform/linux/replay/recorded_driver_registry.h"

namespace tbdaily {

class HostDriverRegistry : public RecordedDriverRegistry {
 public:
  HostDriverRegistry(const Host& host, Recordings& recordings)
      : RecordedDriverRegistry(recordings), host_(host), recordings_(recordings) {}

 protected:
  PlistValue currentEntries() override;
  std::unique_ptr<UserClient> makeClient(const PlistDictionary& client) override;

 private:
  // Whether the host's own drivers answer: nothing is recorded, and no recording opens them.
  bool isLive();
  // Looks through the host when it is first asked for.
  const LiveHost& liveHost();

  const Host& host_;
  Recordings& recordings_;
  std::once_flag once_;
  std::unique_ptr<LiveHost> liveHost_;
};

}  // namespace tbdaily

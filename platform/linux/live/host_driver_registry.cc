#include "platform/linux/live/host_driver_registry.h"

namespace tbdaily {

const LiveHost& HostDriverRegistry::liveHost() {
  std::call_once(once_, [this] { liveHost_ = std::make_unique<LiveHost>(host_.livePath("/"), recordings_); });
  return *liveHost_;
}

bool HostDriverRegistry::isLive() {
  return host_.live() && RecordedDriverRegistry::currentEntries().asArray() == nullptr;
}

PlistValue HostDriverRegistry::currentEntries() {
  return isLive() ? liveHost().entries() : RecordedDriverRegistry::currentEntries();
}

std::unique_ptr<UserClient> HostDriverRegistry::makeClient(const PlistDictionary& client) {
  const bool isLiveHub = isLive() && client.get("kind").asString() == LiveHost::kHubKind;
  return isLiveHub ? makeHubClient({}, liveHost().openValues()) : RecordedDriverRegistry::makeClient(client);
}

}  // namespace tbdaily

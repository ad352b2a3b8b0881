#include "platform/linux/live/host_driver_registry.h"

namespace tbdaily {

const LiveHost& HostDriverRegistry::liveHost() {
  std::call_once(once_, [this] { liveHost_ = std::make_unique<LiveHost>(host_.livePath("/"), recordings_); });
  return *liveHost_;
}

PlistValue HostDriverRegistry::currentEntries() {
  PlistValue recorded = RecordedDriverRegistry::currentEntries();
  return recorded.asArray() != nullptr || !host_.live() ? recorded : liveHost().entries();
}

std::unique_ptr<UserClient> HostDriverRegistry::makeClient(const PlistDictionary& client) {
  if (client.get("kind").asString() != LiveHost::kHubKind) return RecordedDriverRegistry::makeClient(client);
  return host_.live() ? makeHubClient({}, liveHost().openValues()) : nullptr;
}

}  // namespace tbdaily

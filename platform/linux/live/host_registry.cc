#include "platform/linux/live/host_registry.h"

#include <utility>

#include "platform/linux/base/host.h"
#include "platform/linux/live/host_driver_registry.h"
#include "platform/linux/replay/recordings.h"
#include "platform/plist/codec.h"

namespace kdreport {

using namespace tbdaily;

namespace {

// What a registry needs, made before it.
struct RegistryNeeds {
  explicit RegistryNeeds(Host h) : host(std::move(h)) {}

  const Host host;
  PlistCodec codec;
  Recordings recordings{host, codec};
};

class HostRegistry : private RegistryNeeds, public HostDriverRegistry {
 public:
  explicit HostRegistry(Host h) : RegistryNeeds(std::move(h)), HostDriverRegistry(host, recordings) {}
};

}  // namespace

std::unique_ptr<DriverRegistry> openHostRegistry(std::string_view deviceRoot) {
  const Host fromEnvironment = Host::fromEnvironment();
  if (deviceRoot.empty()) return std::make_unique<HostRegistry>(fromEnvironment);
  return std::make_unique<HostRegistry>(Host(deviceRoot, fromEnvironment.live()));
}

}  // namespace kdreport

#include "platform/linux/base/host.h"

#include <cstdlib>
#include <utility>

namespace tbdaily {

namespace fs = std::filesystem;

Host::Host(fs::path root, bool live, fs::path liveRoot)
    : files_(std::make_shared<const DeviceFiles>(std::move(root))),
      live_(live),
      liveRoot_(std::move(liveRoot)) {}

Host Host::fromEnvironment() {
  const char* root = std::getenv("TBDAILY_ROOT");
  const char* live = std::getenv("TBDAILY_LIVE");
  std::error_code ignored;
  fs::path path = root != nullptr && *root != '\0' ? fs::absolute(root, ignored) : fs::path("/");
  return {std::move(path), live == nullptr || std::string_view(live) != "0"};
}

Host Host::withoutRecordings() const {
  Host host = *this;
  host.replays_ = false;
  return host;
}

fs::path Host::livePath(std::string_view absolutePath) const {
  return liveRoot_ / (fs::path("/") / absolutePath).lexically_normal().relative_path();
}

}  // namespace tbdaily

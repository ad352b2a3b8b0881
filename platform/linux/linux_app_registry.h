// Installed applications: the recording's bundles, else the host's desktop entries.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "platform/app_registry.h"
#include "platform/linux/replay/recordings.h"

namespace tbdaily {

struct LiveApplication {
  std::string identifier;  // of its desktop entry
  std::string_view type;
};
// The applications of the host's desktop entries.
std::vector<LiveApplication> liveApplications(const Host& host);

class LinuxAppRegistry : public AppRegistry {
 public:
  LinuxAppRegistry(const Host& host, Recordings& recordings) : host_(host), recordings_(recordings) {}
  void enumerateBundles(BundleKind kind,
                        const std::function<void(std::string_view bundleType)>& bundle) override;
  std::string_view userApplicationType() const override { return "User"; }

 private:
  const Host& host_;
  Recordings& recordings_;
};

}  // namespace tbdaily

// Installed applications: the recording's bundles, else the host's desktop entries.
#pragma once

#include "platform/app_registry.h"
#include "platform/linux/replay/recordings.h"

namespace tbdaily {

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

// Device answers from recordings, else from the host.
#pragma once

#include "platform/device_answers.h"
#include "platform/linux/replay/recordings.h"

namespace tbdaily {

class LinuxDeviceAnswers : public DeviceAnswers {
 public:
  LinuxDeviceAnswers(const Host& host, Recordings& recordings) : host_(host), recordings_(recordings) {}

  bool booleanAnswer(std::string_view question) override;
  PlistValue copyAnswer(std::string_view question) override;
  std::optional<std::string> currentOSBuildVersion() override;
  std::optional<bool> multiUserMode() override;
  SystemGroupContainer systemGroupContainerPath(std::string_view identifier) override;

 private:
  const Host& host_;
  Recordings& recordings_;
};

}  // namespace tbdaily

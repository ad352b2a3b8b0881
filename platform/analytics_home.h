// Where the analytics store lies: below "/var/mobile", or in a system group container when the device is in
// multi-user mode.
#pragma once

#include <cstdint>
#include <mutex>
#include <optional>
#include <string>

#include "platform/device_answers.h"
#include "platform/file_system.h"

namespace tbdaily {

enum class UserMode : std::uint8_t {
  SingleUser,
  MultiUser,
  ForcedMultiUser,  // by the marker file of an internal build
};

// Decides the mode at the first question and keeps the answer as long as it lives; a container that cannot be
// found is looked up again at the next one. May be asked from several threads. Borrows both services.
class AnalyticsHome {
 public:
  struct Answer {
    UserMode mode = UserMode::SingleUser;
    const std::string* path = nullptr;  // as the device sees it; null when the container cannot be found
    std::uint64_t error = 0;            // of the container's look-up; meaningful without a path
  };

  AnalyticsHome(DeviceAnswers& deviceAnswers, FileSystem& fileSystem)
      : deviceAnswers_(deviceAnswers), fileSystem_(fileSystem) {}

  Answer find();

 private:
  UserMode decidedMode() const;

  DeviceAnswers& deviceAnswers_;
  FileSystem& fileSystem_;
  std::mutex mutex_;
  std::optional<UserMode> mode_;
  std::optional<std::string> path_;  // does not change once it is there
};

// The store's file below a home.
std::string analyticsDatabasePath(const std::string& homePath);

}  // namespace tbdaily

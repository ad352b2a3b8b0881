// What the host layer knows of the machine that it runs on: where the device's file tree lies, and whether
// live sources may be asked.
#pragma once

#include <filesystem>
#include <memory>
#include <string_view>

#include "platform/linux/base/device_files.h"

namespace tbdaily {

class Host {
 public:
  // `root` holds the device's file tree. `liveRoot` is where live sources are read, "/" outside of tests.
  Host(std::filesystem::path root, bool live, std::filesystem::path liveRoot = "/");

  // From TBDAILY_ROOT (unset or empty: "/") and TBDAILY_LIVE ("0" switches the live sources off).
  static Host fromEnvironment();

  const std::filesystem::path& root() const { return files_->root(); }
  bool live() const { return live_; }
  // Whether recordings answer in place of the live host.
  bool replays() const { return replays_; }
  // The same host as it is without any.
  Host withoutRecordings() const;

  // The door to the device's files, for as long as the host or a copy of it is there.
  const DeviceFiles& files() const { return *files_; }
  // The place of a live source given by its absolute path.
  std::filesystem::path livePath(std::string_view absolutePath) const;

 private:
  std::shared_ptr<const DeviceFiles> files_;
  bool live_;
  bool replays_ = true;
  std::filesystem::path liveRoot_;
};

}  // namespace tbdaily

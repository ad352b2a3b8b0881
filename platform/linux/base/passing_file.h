// Files that appear whole or not at all, and locks between processes, in folders of the device.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "platform/linux/base/device_folder.h"

namespace tbdaily {

// A file of mode 0600 that is written beside its place under a passing name and then put there; without that,
// its destructor removes it. Passing names begin with ".tmp-".
class TemporaryFile {
 public:
  static constexpr std::string_view kNamePrefix = ".tmp-";

  TemporaryFile() = default;
  ~TemporaryFile();
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;

  // Borrows the folder.
  int create(const DeviceFolder& folder);
  int fd() const { return fd_.get(); }
  // Forces the contents to storage, then takes the place, replacing a file that is there.
  int replace(const std::string& name);
  // The same, but fails with EEXIST where something is there.
  int placeNew(const std::string& name);

 private:
  const DeviceFolder* folder_ = nullptr;
  FileDescriptor fd_;
  std::string name_;  // empty when nothing is left to remove
};

// Removes the passing files that a killed process left in the folder. Nobody else may be writing there.
// Answers the names that are left.
std::vector<std::string> removePassingFiles(const DeviceFolder& folder);

// An exclusive lock between processes on a file of its own, held until destruction. Waits 5 seconds for
// another holder.
class FileLock {
 public:
  // 0, or EWOULDBLOCK when the other holder kept it, or what opening the lock file failed with.
  int acquire(const DeviceFolder& folder, const std::string& name, double timeoutSeconds = 5.0);

 private:
  FileDescriptor fd_;
};

}  // namespace tbdaily

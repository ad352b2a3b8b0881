// Where an analytics store lies, and what this process knows of it.
#pragma once

#include <atomic>
#include <chrono>
#include <filesystem>
#include <memory>
#include <mutex>
#include <string>

#include "platform/linux/base/device_files.h"
#include "platform/linux/base/file_io.h"

namespace tbdaily {

inline constexpr std::chrono::milliseconds kStoreBusyTimeout{5000};

// What one operation on a store found out and the next ones heed. For any thread.
class StoreCondition {
 public:
  explicit StoreCondition(std::chrono::milliseconds busyTimeout = kStoreBusyTimeout)
      : busyTimeout_(busyTimeout) {}

  // How long a lock is waited for: not at all after a wait in vain, until an operation succeeds, so that a
  // store which stays locked costs one wait.
  std::chrono::milliseconds patience() const {
    return isLocked_ ? std::chrono::milliseconds(0) : busyTimeout_;
  }
  void setLocked(bool locked) { isLocked_ = locked; }

  // Damage that showed while rows were read: from then on nothing is written.
  bool isDamaged() const { return isDamaged_; }
  void setDamaged() { isDamaged_ = true; }

  // The file whose pages were found whole: as long as nobody writes to it, they need no second look.
  bool isKnownWhole(const FileIdentity& file) const {
    const std::lock_guard lock(mutex_);
    return file == whole_ && file != FileIdentity();
  }
  void setWhole(const FileIdentity& file) {
    const std::lock_guard lock(mutex_);
    whole_ = file;
  }

 private:
  const std::chrono::milliseconds busyTimeout_;
  std::atomic<bool> isLocked_ = false;
  std::atomic<bool> isDamaged_ = false;
  mutable std::mutex mutex_;
  FileIdentity whole_;  // at first that of no file
};

struct StorePlace {
  const DeviceFiles* files = nullptr;  // borrowed
  std::string folder;                  // a path of the device
  std::string name;
  std::shared_ptr<StoreCondition> condition = std::make_shared<StoreCondition>();

  // On the host, for messages.
  std::filesystem::path file() const { return files->place(folder) / name; }
};

// The place of a path of the device.
StorePlace storePlaceOf(const DeviceFiles& files, std::string_view path);

}  // namespace tbdaily

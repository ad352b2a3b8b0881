#include "platform/linux/linux_run_lock.h"

#include <cerrno>

#include "platform/linux/base/host_notes.h"
#include "platform/linux/base/passing_file.h"
#include "platform/linux/linux_notifications.h"
#include "platform/linux/linux_preferences.h"
#include "platform/linux/log_spool.h"
#include "platform/linux/replay/recordings.h"

namespace tbdaily {

namespace {

constexpr std::string_view kFolder = "/var/run";
constexpr const char* kLockName = "tbdaily.lock";

struct Held : HeldRunLock {
  FileLock lock;
};

// In every folder that files are put into under a passing name.
void clearUpAfterKilledProcesses(const DeviceFiles& files) {
  const std::string logs(LogSpool::kFolder);
  for (const std::string& path :
       {std::string(LinuxPreferences::kFolder), std::string(LinuxNotifications::kFolder),
        std::string(recording::kFolder), logs + "/" + std::string(LogSpool::kPending),
        logs + "/" + std::string(LogSpool::kWithheld)}) {
    DeviceFolder folder;
    if (files.openFolder(path, folder) == 0) removePassingFiles(folder);
  }
}

}  // namespace

std::unique_ptr<HeldRunLock> LinuxRunLock::acquire(std::chrono::seconds patience) {
  auto held = std::make_unique<Held>();
  DeviceFolder folder;
  int error = host_.files().makeFolder(kFolder, folder);
  if (error == 0) error = held->lock.acquire(folder, kLockName, static_cast<double>(patience.count()));
  if (error == EWOULDBLOCK) {
    noteOnce("another run is at work on " + host_.root().native() + " since more than " +
             std::to_string(patience.count()) + " seconds: nothing is run");
    return nullptr;
  }
  if (error != 0) {
    noteWriteFailure(host_.files().place(kFolder) / kLockName, error);
    return nullptr;
  }
  clearUpAfterKilledProcesses(host_.files());
  return held;
}

}  // namespace tbdaily

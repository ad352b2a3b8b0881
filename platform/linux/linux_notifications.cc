#include "platform/linux/linux_notifications.h"

#include <charconv>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host_notes.h"

namespace tbdaily {

std::filesystem::path LinuxNotifications::folder() const {
  return host_.devicePath("/var/run/notifications");
}

std::uint64_t LinuxNotifications::postCount(std::string_view name) const {
  FileContents contents;
  if (readRegularFile(folder() / name, contents) != 0) return 0;
  const auto* text = reinterpret_cast<const char*>(contents.bytes.data());
  std::uint64_t count = 0;
  const auto [end, error] = std::from_chars(text, text + contents.bytes.size(), count);
  return error == std::errc() ? count : 0;
}

void LinuxNotifications::post(std::string_view name) {
  if (!isSafeName(name))
    return noteOnce("notification \"" + std::string(name.substr(0, 40)) + "\" is refused: bad name");
  if (const int error = host_.makeFolders(folder()); error != 0) return noteWriteFailure(folder(), error);
  const std::filesystem::path lockFile = folder().parent_path() / "notifications.lock";
  FileLock lock;
  if (const int error = lock.acquire(lockFile); error != 0) return noteWriteFailure(lockFile, error);
  const std::filesystem::path place = folder() / name;
  const int error = replaceFile(place, std::to_string(postCount(name) + 1) + "\n");
  if (error != 0) noteWriteFailure(place, error);
}

}  // namespace tbdaily

#include "platform/linux/linux_notifications.h"

#include <charconv>

#include "platform/linux/base/host_notes.h"
#include "platform/linux/base/passing_file.h"

namespace tbdaily {

namespace {
constexpr std::string_view kAround = "/var/run";
constexpr const char* kLockName = "notifications.lock";
constexpr std::size_t kLongestCount = 64;
}  // namespace

std::uint64_t LinuxNotifications::postCount(std::string_view name) const {
  FileContents contents;
  const std::string path = std::string(kFolder).append("/").append(name);
  if (host_.files().readFile(path, contents, kLongestCount) != 0) return 0;
  const auto* text = reinterpret_cast<const char*>(contents.bytes.data());
  std::uint64_t count = 0;
  const auto [end, error] = std::from_chars(text, text + contents.bytes.size(), count);
  return error == std::errc() ? count : 0;
}

void LinuxNotifications::post(std::string_view name) {
  if (!isSafeName(name))
    return noteOnce("notification \"" + std::string(name.substr(0, 40)) + "\" is refused: bad name");
  DeviceFolder around, folder;
  int error = host_.files().makeFolder(kAround, around);
  FileLock lock;
  if (error == 0) error = lock.acquire(around, kLockName);
  if (error == 0) error = around.makeFolder(std::string(kFolder.substr(kAround.size() + 1)), folder);
  if (error == 0) error = folder.replaceFile(std::string(name), std::to_string(postCount(name) + 1) + "\n");
  if (error != 0) noteWriteFailure(host_.files().place(kFolder) / name, error);
}

}  // namespace tbdaily

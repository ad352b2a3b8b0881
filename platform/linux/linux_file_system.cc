#include "platform/linux/linux_file_system.h"

#include <sys/stat.h>

#include <cerrno>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host_notes.h"

namespace tbdaily {

std::optional<FileStatus> LinuxFileSystem::status(std::string_view path) {
  struct stat status {};
  if (::stat(host_.devicePath(path).c_str(), &status) != 0) return std::nullopt;
  return FileStatus{status.st_size};
}

std::optional<std::vector<std::byte>> LinuxFileSystem::readFile(std::string_view path) {
  const std::filesystem::path place = host_.devicePath(path);
  FileContents contents;
  if (const int error = readRegularFile(place, contents); error != 0) {
    if (error != ENOENT) noteOnce("cannot read " + place.native() + ": " + errorText(error));
    return std::nullopt;
  }
  return std::move(contents.bytes);
}

}  // namespace tbdaily

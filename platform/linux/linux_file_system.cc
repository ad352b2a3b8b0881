#include "platform/linux/linux_file_system.h"

#include <sys/stat.h>

#include <cerrno>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace {

// What is there and cannot be looked at is not missing: it is named.
void noteUnreadable(const Host& host, std::string_view path, int error) {
  if (error != ENOENT && error != kUnusableRoot)
    host.files().noteUnread("cannot read " + host.files().place(path).native() + ": " + errorText(error));
}

}  // namespace

std::optional<FileStatus> LinuxFileSystem::status(std::string_view path) {
  struct stat status {};
  if (const int error = host_.files().status(path, status); error != 0) {
    noteUnreadable(host_, path, error);
    return std::nullopt;
  }
  return FileStatus{status.st_size};
}

std::optional<std::vector<std::byte>> LinuxFileSystem::readFile(std::string_view path) {
  FileContents contents;
  if (const int error = host_.files().readFile(path, contents); error != 0) {
    noteUnreadable(host_, path, error);
    return std::nullopt;
  }
  return std::move(contents.bytes);
}

}  // namespace tbdaily

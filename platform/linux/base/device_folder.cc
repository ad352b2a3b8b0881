#include "platform/linux/base/device_folder.h"

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>

#include "platform/linux/base/device_files.h"
#include "platform/linux/base/file_judgement.h"
#include "platform/linux/base/passing_file.h"

namespace tbdaily {

namespace fs = std::filesystem;

fs::path DeviceFolder::place(std::string_view name) const {
  return files_->place(path_) / name;
}

fs::path DeviceFolder::throughDescriptor(std::string_view name) const {
  return fs::path("/proc/self/fd") / std::to_string(descriptor_.get()) / name;
}

int DeviceFolder::open(const std::string& name, int flags, FileDescriptor& file) const {
  file = FileDescriptor(::openat(descriptor_.get(), name.c_str(), flags | O_NOFOLLOW | O_CLOEXEC, 0600));
  return file.isOpen() ? 0 : errno;
}

int DeviceFolder::names(std::vector<std::string>& names) const {
  // A descriptor of its own: reading moves its place in the folder.
  const FileDescriptor copy(::openat(descriptor_.get(), ".", kOpenFolder));
  if (!copy.isOpen()) return errno;
  alignas(dirent64) std::array<char, 32768> entries;
  while (true) {
    const ssize_t filled = ::getdents64(copy.get(), entries.data(), entries.size());
    if (filled <= 0) return filled == 0 ? 0 : errno;
    for (std::size_t at = 0; at < static_cast<std::size_t>(filled);) {
      const auto* entry = reinterpret_cast<const dirent64*>(entries.data() + at);
      const std::string_view name = entry->d_name;
      if (name != "." && name != "..") names.emplace_back(name);
      at += entry->d_reclen;
    }
  }
}

int DeviceFolder::status(const std::string& name, struct stat& status) const {
  return ::fstatat(descriptor_.get(), name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 ? 0 : errno;
}

bool DeviceFolder::has(const std::string& name) const {
  struct stat ignored {};
  return status(name, ignored) != ENOENT;
}

int DeviceFolder::openForReading(const std::string& name, FileDescriptor& file) const {
  int error = openingError(open(name, O_RDONLY | kOpenFile, file));
  if (error == 0) error = judgeOpenFile(file.get(), false);
  if (error != 0) file.reset();
  return error;
}

int DeviceFolder::openOrMake(const std::string& name, int flags, WrittenInPlace writtenInPlace,
                             FileDescriptor& file) const {
  int error = open(name, flags, file);
  if (error == ENOENT) {
    error = open(name, flags | O_CREAT | O_EXCL, file);
    if (error == 0) {
      giveToOwner(file.get());
      touch();
      return 0;
    }
    if (error == EEXIST) error = open(name, flags, file);
  }
  error = openingError(error);
  if (error == 0) error = judgeOpenFile(file.get(), writtenInPlace == WrittenInPlace::Yes);
  if (error != 0) file.reset();
  return error;
}

int DeviceFolder::openForAppending(const std::string& name, FileDescriptor& file) const {
  const int error = openOrMake(name, O_WRONLY | O_APPEND | kOpenFile, WrittenInPlace::Yes, file);
  if (error == 0) files_->rememberToSync(path_ + "/" + name, false);
  return error;
}

int DeviceFolder::openForLocking(const std::string& name, FileDescriptor& file) const {
  return openOrMake(name, O_RDWR | kOpenFile, WrittenInPlace::No, file);
}

int DeviceFolder::makeFileUnopened(const std::string& name) const {
  if (::mknodat(descriptor_.get(), name.c_str(), S_IFREG | 0600, 0) != 0) return errno;
  if (const Owner here = owner(); here.user != 0 || here.group != 0) {
    [[maybe_unused]] const int ignored =
        ::fchownat(descriptor_.get(), name.c_str(), here.user, here.group, AT_SYMLINK_NOFOLLOW);
  }
  touch();
  return 0;
}

int DeviceFolder::openFolder(const std::string& name, DeviceFolder& folder) const {
  FileDescriptor opened;
  if (const int error = open(name, kOpenFolder, opened); error != 0) {
    struct stat there {};
    return error == ENOTDIR && status(name, there) == 0 && S_ISLNK(there.st_mode) ? kLinkInPlace : error;
  }
  folder.files_ = files_;
  folder.path_ = path_ + "/" + name;
  folder.owner_.reset();
  folder.descriptor_ = std::move(opened);
  return 0;
}

int DeviceFolder::makeFolder(const std::string& name, DeviceFolder& folder) const {
  int error = openFolder(name, folder);
  if (error != ENOENT) return error;
  const bool isMade = ::mkdirat(descriptor_.get(), name.c_str(), 0700) == 0;
  if (!isMade && errno != EEXIST) return errno;
  error = openFolder(name, folder);
  if (error == 0 && isMade) {
    giveToOwner(folder.descriptor());
    touch();
  }
  return error;
}

int DeviceFolder::remove(const std::string& name) const {
  if (::unlinkat(descriptor_.get(), name.c_str(), 0) != 0) return errno;
  touch();
  return 0;
}

int DeviceFolder::rename(const std::string& name, const DeviceFolder& to, const std::string& newName) const {
  if (::renameat(descriptor_.get(), name.c_str(), to.descriptor(), newName.c_str()) != 0) return errno;
  touch();
  to.touch();
  return 0;
}

int DeviceFolder::replaceFile(const std::string& name, std::string_view contents) const {
  TemporaryFile file;
  if (const int error = file.create(*this); error != 0) return error;
  if (const int error = writeAll(file.fd(), contents); error != 0) return error;
  return file.replace(name);
}

void DeviceFolder::touch() const {
  files_->rememberToSync(path_, true);
}

int DeviceFolder::sync() const {
  return ::fsync(descriptor_.get()) == 0 ? 0 : errno;
}

DeviceFolder::Owner DeviceFolder::owner() const {
  if (processUser() != 0) return {};
  if (!owner_) {
    struct stat here {};
    owner_ = ::fstat(descriptor_.get(), &here) == 0 ? Owner{here.st_uid, here.st_gid} : Owner{};
  }
  return *owner_;
}

void DeviceFolder::giveToOwner(int file) const {
  const Owner here = owner();
  if (here.user == 0 && here.group == 0) return;
  // Where that is not to be had (a file system without owners), the file stays root's.
  [[maybe_unused]] const int ignored = ::fchown(file, here.user, here.group);
}

}  // namespace tbdaily

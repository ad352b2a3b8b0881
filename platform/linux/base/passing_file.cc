#include "platform/linux/base/passing_file.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <charconv>
#include <csignal>
#include <ctime>

#include "platform/linux/base/file_judgement.h"

namespace tbdaily {

namespace {

std::string randomName() {
  static std::atomic<unsigned> count = 0;
  return std::string(TemporaryFile::kNamePrefix) + std::to_string(::getpid()) + "-" + std::to_string(++count);
}

}  // namespace

TemporaryFile::~TemporaryFile() {
  if (!name_.empty()) ::unlinkat(folder_->descriptor(), name_.c_str(), 0);
}

int TemporaryFile::create(const DeviceFolder& folder) {
  folder_ = &folder;
  int error = EEXIST;
  for (int attempt = 0; attempt < 100 && error == EEXIST; ++attempt) {
    name_ = randomName();
    error = folder.open(name_, O_RDWR | O_CREAT | O_EXCL, fd_);
  }
  if (error != 0) name_.clear();
  if (error != 0) return error;
  // Tells others that somebody is still writing.
  ::flock(fd_.get(), LOCK_EX | LOCK_NB);
  folder.giveToOwner(fd_.get());
  return 0;
}

int TemporaryFile::replace(const std::string& name) {
  struct stat there {};
  int error = folder_->status(name, there);
  if (error == 0 && S_ISLNK(there.st_mode)) return kLinkInPlace;
  if (error == 0 && !S_ISREG(there.st_mode)) return kNotARegularFile;
  if (error != 0 && error != ENOENT) return error;
  if (const DeviceFolder::Owner here = folder_->owner();
      error == 0 && processUser() == 0 && (there.st_uid != here.user || there.st_gid != here.group)) {
    [[maybe_unused]] const int ignored = ::fchown(fd_.get(), there.st_uid, there.st_gid);
  }
  if (::fsync(fd_.get()) != 0) return errno;
  error = folder_->rename(name_, *folder_, name);
  if (error == 0) name_.clear();
  return error;
}

int TemporaryFile::placeNew(const std::string& name) {
  if (::fsync(fd_.get()) != 0) return errno;
  const int folder = folder_->descriptor();
  if (::linkat(folder, name_.c_str(), folder, name.c_str(), 0) != 0) return errno;
  ::unlinkat(folder, name_.c_str(), 0);
  name_.clear();
  folder_->touch();
  return 0;
}

namespace {

// Whether nobody writes the passing file any more. The lock says so, but for the moment between the making of
// a file and its locking: then its process lives, or, where that cannot be told, the file is young.
bool isAbandoned(const DeviceFolder& folder, const std::string& name) {
  constexpr std::time_t kLongEnough = 60;
  FileDescriptor file;
  const int error = folder.openForReading(name, file);
  if (error != 0) return error == kLinkInPlace || error == kNotARegularFile;
  if (::flock(file.get(), LOCK_EX | LOCK_NB) != 0) return false;
  pid_t writer = 0;
  const char* digits = name.c_str() + TemporaryFile::kNamePrefix.size();
  std::from_chars(digits, name.c_str() + name.size(), writer);
  const bool isWriterAlive = writer > 0 && writer != ::getpid() && (::kill(writer, 0) == 0 || errno == EPERM);
  struct stat status {};
  return !isWriterAlive || ::fstat(file.get(), &status) != 0 ||
         std::time(nullptr) - status.st_mtime > kLongEnough;
}

}  // namespace

std::vector<std::string> removePassingFiles(const DeviceFolder& folder) {
  std::vector<std::string> names;
  folder.names(names);
  std::erase_if(names, [&folder](const std::string& name) {
    return name.starts_with(TemporaryFile::kNamePrefix) && isAbandoned(folder, name) &&
           folder.remove(name) == 0;
  });
  return names;
}

int FileLock::acquire(const DeviceFolder& folder, const std::string& name, double timeoutSeconds) {
  FileDescriptor file;
  int error = folder.openForLocking(name, file);
  if (error != 0) return error;
  error = waitForLock(file.get(), timeoutSeconds);
  if (error == 0) fd_ = std::move(file);
  return error;
}

}  // namespace tbdaily

#include "platform/linux/base/device_files.h"

#include <dirent.h>
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/file.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <charconv>
#include <climits>
#include <csignal>
#include <ctime>
#include <deque>
#include <utility>

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace fs = std::filesystem;

namespace {

constexpr int kFile = O_CLOEXEC | O_NONBLOCK | O_NOCTTY;
constexpr int kFolder = O_RDONLY | O_DIRECTORY | O_CLOEXEC;
constexpr int kLook = O_PATH | O_CLOEXEC;
constexpr int kMostLinks = 40;

// The names of a path, from the root on.
std::deque<std::string> namesOf(std::string_view path) {
  std::deque<std::string> names;
  while (!path.empty()) {
    const std::size_t end = std::min(path.find('/'), path.size());
    if (end > 0) names.emplace_back(path.substr(0, end));
    path.remove_prefix(std::min(end + 1, path.size()));
  }
  return names;
}

// "var/log/x" for "/var/log/x", with every ".." taken away; "." for the root itself.
std::string belowRoot(std::string_view path) {
  const fs::path relative = (fs::path("/") / path).lexically_normal().relative_path();
  std::string text = relative.native();
  while (!text.empty() && text.back() == '/') text.pop_back();
  return text.empty() ? "." : text;
}

uid_t processUser() {
  static const uid_t user = ::geteuid();
  return user;
}

bool isOurs(const struct stat& status) {
  return status.st_uid == 0 || status.st_uid == processUser();
}

int readLink(int link, std::string& target) {
  target.resize(PATH_MAX);
  const ssize_t length = ::readlinkat(link, "", target.data(), target.size());
  if (length < 0) return errno;
  target.resize(static_cast<std::size_t>(length));
  return 0;
}

bool leadsThrough(const std::vector<FileDescriptor>& way, const struct stat& folder) {
  return std::any_of(way.begin(), way.end(), [&folder](const FileDescriptor& passed) {
    struct stat status {};
    return ::fstat(passed.get(), &status) == 0 && status.st_ino == folder.st_ino &&
           status.st_dev == folder.st_dev;
  });
}

// The file that was opened is what its place asks for.
int judgeOpenFile(int file, bool isWrittenInPlace) {
  struct stat status {};
  if (::fstat(file, &status) != 0) return errno;
  if (!S_ISREG(status.st_mode)) return kNotARegularFile;
  return isWrittenInPlace && status.st_nlink > 1 ? kSecondName : 0;
}

// What opening without following links failed with, by its reason.
int openingError(int error) {
  if (error == ELOOP) return kLinkInPlace;
  return error == ENXIO || error == EISDIR ? kNotARegularFile : error;
}

std::string randomName() {
  static std::atomic<unsigned> count = 0;
  return std::string(TemporaryFile::kNamePrefix) + std::to_string(::getpid()) + "-" + std::to_string(++count);
}

}  // namespace

// ---- A folder

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
  const int copy = ::openat(descriptor_.get(), ".", kFolder);
  if (copy < 0) return errno;
  DIR* entries = ::fdopendir(copy);
  if (entries == nullptr) {
    const int error = errno;
    ::close(copy);
    return error;
  }
  errno = 0;
  while (const dirent* entry = ::readdir(entries)) {
    const std::string_view name = entry->d_name;
    if (name != "." && name != "..") names.emplace_back(name);
    errno = 0;
  }
  const int error = errno;
  ::closedir(entries);
  return error;
}

int DeviceFolder::status(const std::string& name, struct stat& status) const {
  return ::fstatat(descriptor_.get(), name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 ? 0 : errno;
}

bool DeviceFolder::has(const std::string& name) const {
  struct stat ignored {};
  return status(name, ignored) != ENOENT;
}

int DeviceFolder::judgePlace(const std::string& name) const {
  struct stat there {};
  const int error = status(name, there);
  if (error != 0) return error == ENOENT ? 0 : error;
  if (S_ISLNK(there.st_mode)) return kLinkInPlace;
  return S_ISREG(there.st_mode) ? 0 : kNotARegularFile;
}

int DeviceFolder::openForReading(const std::string& name, FileDescriptor& file) const {
  int error = openingError(open(name, O_RDONLY | kFile, file));
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
  const int error = openOrMake(name, O_WRONLY | O_APPEND | kFile, WrittenInPlace::Yes, file);
  if (error == 0) files_->rememberToSync(path_ + "/" + name, false);
  return error;
}

int DeviceFolder::openForLocking(const std::string& name, FileDescriptor& file) const {
  return openOrMake(name, O_RDWR | kFile, WrittenInPlace::No, file);
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
  if (const int error = open(name, kFolder, opened); error != 0) {
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

// ---- A file under a passing name

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

// ---- The tree

fs::path DeviceFiles::place(std::string_view path) const {
  return root_ / (fs::path("/") / path).lexically_normal().relative_path();
}

int DeviceFiles::openRootDescriptor() const {
  if (rootDescriptor_.isOpen()) return 0;
  rootDescriptor_ = FileDescriptor(::open(root_.c_str(), kLook | O_DIRECTORY));
  return rootDescriptor_.isOpen() ? 0 : errno;
}

int DeviceFiles::openRoot(int& descriptor) const {
  const std::lock_guard lock(mutex_);
  if (const int error = openRootDescriptor(); error != 0) {
    noteUnusableRoot(root_, error);
    return kUnusableRoot;
  }
  descriptor = rootDescriptor_.get();
  return 0;
}

int DeviceFiles::examineRoot() const {
  const std::lock_guard lock(mutex_);
  return openRootDescriptor();
}

int DeviceFiles::open(std::string_view path, int flags, FileDescriptor& file) const {
  int root = 0;
  if (const int error = openRoot(root); error != 0) return error;
  // Without a link on the way one call does.
  open_how how{};
  how.flags = static_cast<__u64>(static_cast<unsigned>(flags | O_CLOEXEC));
  how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS;
  const long opened = ::syscall(SYS_openat2, root, belowRoot(path).c_str(), &how, sizeof how);
  if (opened >= 0) {
    file = FileDescriptor(static_cast<int>(opened));
    return 0;
  }
  const bool isDecided =
      errno != ELOOP && errno != ENOSYS && errno != EPERM && errno != EAGAIN && errno != EINVAL;
  return isDecided ? errno : walk(path, flags, {}, file);
}

int DeviceFiles::walk(std::string_view path, int flags, const Rules& rules, FileDescriptor& file) const {
  int root = 0;
  if (const int error = openRoot(root); error != 0) return error;
  std::deque<std::string> rest = namesOf(belowRoot(path));
  std::vector<FileDescriptor> way;  // the folders from the root on, without it
  std::vector<std::string> names;
  const auto here = [&] { return way.empty() ? root : way.back().get(); };
  const auto approves = [&](const struct stat& status, const std::string& name) {
    if (rules.judge == nullptr) return true;
    const std::string reason = (*rules.judge)(status);
    if (reason.empty()) return true;
    fs::path at = root_;
    for (const std::string& passed : names) at /= passed;
    *rules.complaint = (at / name).native() + ": " + reason;
    return false;
  };
  struct stat status {};
  if (rules.judge != nullptr && (::fstat(root, &status) != 0 || !approves(status, {}))) return EPERM;
  int links = 0;
  while (!rest.empty()) {
    const std::string name = std::move(rest.front());
    rest.pop_front();
    if (name == ".") continue;
    if (name == "..") {
      if (!way.empty()) {
        way.pop_back();
        names.pop_back();
      }
      continue;
    }
    FileDescriptor entry(::openat(here(), name.c_str(), kLook | O_NOFOLLOW));
    if (!entry.isOpen() || ::fstat(entry.get(), &status) != 0) return errno;
    if (S_ISLNK(status.st_mode)) {
      if (!isOurs(status)) return kForeignLink;
      if (++links > kMostLinks) return ELOOP;
      std::string target;
      if (const int error = readLink(entry.get(), target); error != 0) return error;
      if (target.starts_with('/')) {
        way.clear();
        names.clear();
      }
      const std::deque<std::string> further = namesOf(target);
      rest.insert(rest.begin(), further.begin(), further.end());
      continue;
    }
    if (!approves(status, name)) return EPERM;
    if (!S_ISDIR(status.st_mode) && !rest.empty()) return ENOTDIR;
    if (!S_ISDIR(status.st_mode) || rest.empty()) {
      if (rules.fence != nullptr && !leadsThrough(way, *rules.fence)) return kOutside;
      // The last one, opened as it is asked for; no link has come into its place, or that is refused.
      file = FileDescriptor(::openat(here(), name.c_str(), flags | O_NOFOLLOW | O_CLOEXEC));
      if (!file.isOpen()) return errno == ELOOP ? kLinkInPlace : errno;
      struct stat opened {};
      if (::fstat(file.get(), &opened) != 0) return errno;
      return opened.st_ino == status.st_ino && opened.st_dev == status.st_dev ? 0 : EAGAIN;
    }
    way.push_back(std::move(entry));
    names.push_back(name);
  }
  if (rules.fence != nullptr) return kOutside;
  file = FileDescriptor(::openat(here(), ".", flags | O_CLOEXEC));
  return file.isOpen() ? 0 : errno;
}

int DeviceFiles::openForReading(std::string_view path, FileDescriptor& file) const {
  int error = open(path, O_RDONLY | kFile, file);
  if (error == ENXIO) error = kNotARegularFile;  // a socket
  if (error == 0) error = judgeOpenFile(file.get(), false);
  if (error != 0) file.reset();
  return error;
}

int DeviceFiles::readFile(std::string_view path, FileContents& contents, std::size_t maximumSize) const {
  FileDescriptor file;
  const int error = open(path, O_RDONLY | kFile, file);
  if (error != 0) return error == ENXIO ? kNotARegularFile : error;
  return readOpenFile(file.get(), contents, maximumSize);
}

int DeviceFiles::readFileBelow(std::string_view folder, std::string_view file, FileContents& contents) const {
  struct stat fence {};
  if (const int error = status(folder, fence); error != 0) return error;
  FileDescriptor opened;
  Rules rules;
  rules.fence = &fence;
  const int error = walk(std::string(folder).append("/").append(file), O_RDONLY | kFile, rules, opened);
  if (error != 0) return error == ENXIO ? kNotARegularFile : error;
  return readOpenFile(opened.get(), contents);
}

int DeviceFiles::status(std::string_view path, struct stat& status) const {
  FileDescriptor file;
  if (const int error = open(path, kLook, file); error != 0) return error;
  return ::fstat(file.get(), &status) == 0 ? 0 : errno;
}

bool DeviceFiles::isUnchanged(std::string_view path, const FileIdentity& identity) const {
  int root = 0;
  if (openRoot(root) != 0) return false;
  struct stat status {};
  return ::fstatat(root, belowRoot(path).c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 &&
         FileIdentity::of(status) == identity;
}

int DeviceFiles::openFolder(std::string_view path, DeviceFolder& folder) const {
  FileDescriptor opened;
  if (const int error = open(path, kFolder, opened); error != 0) return error;
  folder.files_ = this;
  folder.path_.assign("/").append(belowRoot(path));
  folder.owner_.reset();
  folder.descriptor_ = std::move(opened);
  return 0;
}

int DeviceFiles::makeFolder(std::string_view path, DeviceFolder& folder) const {
  const int error = openFolder(path, folder);
  const fs::path normal = fs::path("/") / belowRoot(path);
  if (error != ENOENT) return error;
  DeviceFolder parent;
  if (const int parentError = makeFolder(normal.parent_path().native(), parent); parentError != 0)
    return parentError;
  return parent.makeFolder(normal.filename(), folder);
}

int DeviceFiles::openJudged(std::string_view path, const Judge& judge, FileDescriptor& file,
                            std::string& complaint) const {
  complaint.clear();
  int error = walk(path, O_RDONLY | kFile, {&judge, &complaint, nullptr}, file);
  if (error == 0) error = judgeOpenFile(file.get(), false);
  if (error != 0) {
    file.reset();
    if (complaint.empty() && error != ENOENT && error != ENOTDIR)
      complaint = place(path).native() + ": " + errorText(error);
  }
  return error;
}

void DeviceFiles::rememberToSync(const std::string& path, bool isFolder) const {
  const std::lock_guard lock(mutex_);
  (isFolder ? touchedFolders_ : touchedFiles_).insert(path);
}

bool DeviceFiles::makeDurable() const {
  std::set<std::string> folders, files;
  {
    const std::lock_guard lock(mutex_);
    folders.swap(touchedFolders_);
    files = touchedFiles_;  // they stay open and may be written to again
  }
  bool isDurable = true;
  for (const auto& [paths, flags] : {std::pair(&files, O_RDONLY | kFile), {&folders, kFolder}}) {
    for (const std::string& path : *paths) {
      FileDescriptor file;
      int error = open(path, flags, file);
      if (error == ENOENT) continue;  // moved on since, and with it its own entry
      if (error == 0 && ::fsync(file.get()) != 0) error = errno;
      if (error == 0) continue;
      noteWriteFailure(place(path), error);
      isDurable = false;
    }
  }
  return isDurable;
}

}  // namespace tbdaily

#include "platform/linux/base/device_files.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <deque>
#include <utility>

#include "platform/linux/base/file_judgement.h"
#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace fs = std::filesystem;

namespace {

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
  std::string normal;
  while (!path.empty()) {
    const std::string_view name = path.substr(0, path.find('/'));
    path.remove_prefix(std::min(name.size() + 1, path.size()));
    if (name.empty() || name == ".") continue;
    if (name == "..") {
      normal.resize(normal.find_last_of('/') == normal.npos ? 0 : normal.find_last_of('/'));
    } else {
      normal.append(normal.empty() ? "" : "/").append(name);
    }
  }
  return normal.empty() ? "." : normal;
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

}  // namespace

fs::path DeviceFiles::place(std::string_view path) const {
  const std::string below = belowRoot(path);
  return below == "." ? root_ / "" : root_ / below;
}

int DeviceFiles::openRootDescriptor() const {
  if (rootDescriptor_.isOpen()) return 0;
  // By its own entry, which only those can look up who may use the root.
  rootDescriptor_ = FileDescriptor(::open((root_ / ".").c_str(), kLook | O_DIRECTORY));
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
  int error = open(path, O_RDONLY | kOpenFile, file);
  if (error == ENXIO) error = kNotARegularFile;  // a socket
  if (error == 0) error = judgeOpenFile(file.get(), false);
  if (error != 0) file.reset();
  return error;
}

int DeviceFiles::readFile(std::string_view path, FileContents& contents, std::size_t maximumSize) const {
  FileDescriptor file;
  const int error = open(path, O_RDONLY | kOpenFile, file);
  if (error != 0) return error == ENXIO ? kNotARegularFile : error;
  return readOpenFile(file.get(), contents, maximumSize);
}

int DeviceFiles::readFileBelow(std::string_view folder, std::string_view file, FileContents& contents) const {
  struct stat fence {};
  if (const int error = status(folder, fence); error != 0) return error;
  FileDescriptor opened;
  Rules rules;
  rules.fence = &fence;
  const int error = walk(std::string(folder).append("/").append(file), O_RDONLY | kOpenFile, rules, opened);
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
  if (const int error = open(path, kOpenFolder, opened); error != 0) return error;
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
  int error = walk(path, O_RDONLY | kOpenFile, {&judge, &complaint, nullptr}, file);
  if (error == 0) error = judgeOpenFile(file.get(), false);
  if (error != 0) {
    file.reset();
    if (complaint.empty() && error != ENOENT && error != ENOTDIR)
      complaint = place(path).native() + ": " + errorText(error);
  }
  return error;
}

void DeviceFiles::noteUnread(const std::string& line) const {
  hasUnread_ = true;
  noteOnce(line);
  constexpr std::size_t kMostLines = 100;
  const std::lock_guard lock(mutex_);
  if (unread_.size() < kMostLines && std::ranges::find(unread_, line) == unread_.end())
    unread_.push_back(line);
}

std::vector<std::string> DeviceFiles::unread() const {
  const std::lock_guard lock(mutex_);
  return unread_;
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
  for (const auto& [paths, flags] : {std::pair(&files, O_RDONLY | kOpenFile), {&folders, kOpenFolder}}) {
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

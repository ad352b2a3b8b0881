#include "platform/linux/base/file_io.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <ctime>
#include <thread>

#include "platform/linux/base/file_judgement.h"

namespace tbdaily {

void FileDescriptor::reset() {
  if (fd_ >= 0) ::close(fd_);
  fd_ = -1;
}

FileIdentity FileIdentity::of(const struct stat& status) {
  return {status.st_dev,          status.st_ino,         status.st_size,        status.st_mtim.tv_sec,
          status.st_mtim.tv_nsec, status.st_ctim.tv_sec, status.st_ctim.tv_nsec};
}

namespace {
// File times advance with the system's timer, by 10 ms at the coarsest; clocks of network file systems may be
// ahead of ours.
bool isSettled(const FileIdentity& identity) {
  constexpr std::int64_t kSettlingNanoseconds = 50'000'000;
  timespec now{};
  ::clock_gettime(CLOCK_REALTIME, &now);
  const std::int64_t seconds = now.tv_sec - identity.changedSeconds;
  if (seconds < 0 || seconds > 1) return seconds > 1;
  return seconds * 1'000'000'000 + now.tv_nsec - identity.changedNanoseconds > kSettlingNanoseconds;
}
}  // namespace

int readOpenFile(int fd, FileContents& contents, std::size_t maximumSize) {
  struct stat status {};
  if (::fstat(fd, &status) != 0) return errno;
  if (!S_ISREG(status.st_mode)) return kNotARegularFile;
  if (static_cast<std::uint64_t>(status.st_size) > maximumSize) return EFBIG;
  contents.identity = FileIdentity::of(status);
  if (!isSettled(contents.identity)) contents.identity = {};
  // Room for one byte more than the file had tells whether it grew since. The kernel's own files have no
  // size.
  constexpr std::size_t kSmallestRead = 4096;
  const auto size = static_cast<std::size_t>(status.st_size);
  contents.bytes.resize(std::max(size + 1, kSmallestRead));
  std::size_t filled = 0;
  while (true) {
    if (filled == contents.bytes.size()) contents.bytes.resize(filled + std::max<std::size_t>(filled / 8, 1));
    const ssize_t count = ::read(fd, contents.bytes.data() + filled, contents.bytes.size() - filled);
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return errno;
    if (count == 0) break;
    filled += static_cast<std::size_t>(count);
    if (filled > maximumSize) return EFBIG;
    if (filled == size && filled < contents.bytes.size()) break;  // no more than it had
  }
  contents.bytes.resize(filled);
  return 0;
}

int openHostFile(const std::filesystem::path& path, FileDescriptor& file) {
  file = FileDescriptor(::open(path.c_str(), O_RDONLY | kOpenFile));
  if (!file.isOpen())
    return errno == ENXIO ? kNotARegularFile : errno;  // a socket, a device that is not there
  const int error = judgeOpenFile(file.get(), false);
  if (error != 0) file.reset();
  return error;
}

int readHostFile(const std::filesystem::path& path, FileContents& contents, std::size_t maximumSize) {
  FileDescriptor file;
  const int error = openHostFile(path, file);
  return error == 0 ? readOpenFile(file.get(), contents, maximumSize) : error;
}

std::string_view takeLine(std::string_view& rest) {
  const std::string_view line = rest.substr(0, rest.find('\n'));
  rest.remove_prefix(std::min(line.size() + 1, rest.size()));
  return line;
}

int writeAll(int fd, std::span<const std::byte> bytes) {
  while (!bytes.empty()) {
    const ssize_t count = ::write(fd, bytes.data(), bytes.size());
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return errno;
    bytes = bytes.subspan(static_cast<std::size_t>(count));
  }
  return 0;
}

int writeAll(int fd, std::string_view text) {
  return writeAll(fd, std::as_bytes(std::span(text)));
}

int waitForLock(int fd, double timeoutSeconds) {
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::duration<double>(timeoutSeconds);
  while (::flock(fd, LOCK_EX | LOCK_NB) != 0) {
    const int error = errno;
    if (error != EWOULDBLOCK && error != EINTR) return error;
    if (std::chrono::steady_clock::now() >= deadline) return EWOULDBLOCK;
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  return 0;
}

bool isSafeName(std::string_view name) {
  constexpr std::size_t kMaximumLength = 200;
  if (name.empty() || name.size() > kMaximumLength || name.front() == '.') return false;
  return std::all_of(name.begin(), name.end(), [](char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '.' ||
           c == '-' || c == '_';
  });
}

}  // namespace tbdaily

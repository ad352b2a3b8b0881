// Open files: owned descriptors, whole reads and writes, locks between processes. Failures are errno values
// or a FileRefusal, 0 is success.
#pragma once

#include <sys/stat.h>

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace tbdaily {

// Why the door to the device's files refuses one, beside the errno values.
enum FileRefusal : int {
  kForeignLink = 0x10000,  // a symbolic link of another user is on the way
  kLinkInPlace,            // a symbolic link in the place of a file
  kNotARegularFile,        // a folder, pipe, socket or device in the place of a file
  kSecondName,             // a file that is written in place and has a second name
  kOutside,                // what must lie below a folder leads out of it
  kUnusableRoot,           // the device root cannot be opened, which has been named already
};

// Owns a file descriptor.
class FileDescriptor {
 public:
  FileDescriptor() = default;
  explicit FileDescriptor(int fd) : fd_(fd) {}
  FileDescriptor(FileDescriptor&& other) noexcept : fd_(std::exchange(other.fd_, -1)) {}
  FileDescriptor& operator=(FileDescriptor&& other) noexcept {
    if (this != &other) {
      reset();
      fd_ = std::exchange(other.fd_, -1);
    }
    return *this;
  }
  ~FileDescriptor() { reset(); }

  int get() const { return fd_; }
  bool isOpen() const { return fd_ >= 0; }
  void reset();
  // Leaves the descriptor open, to whoever has taken it.
  void release() { fd_ = -1; }

 private:
  int fd_ = -1;
};

// What tells one state of a file from another without reading it. The default one is that of no file.
struct FileIdentity {
  std::uint64_t device = 0, inode = 0;
  std::int64_t size = -1;
  std::int64_t modifiedSeconds = 0, modifiedNanoseconds = 0;
  std::int64_t changedSeconds = 0, changedNanoseconds = 0;
  static FileIdentity of(const struct stat& status);
  friend bool operator==(const FileIdentity&, const FileIdentity&) = default;
};

struct FileContents {
  std::vector<std::byte> bytes;
  // The file's, by which a later look may tell that it is unchanged; that of no file where it may not, since
  // the file had just been written and a second write could leave no trace in its times.
  FileIdentity identity;

  std::string_view text() const { return {reinterpret_cast<const char*>(bytes.data()), bytes.size()}; }
};

// The first line without its end, taken from what is left of a text.
std::string_view takeLine(std::string_view& rest);

inline constexpr std::size_t kMaximumFileSize = std::size_t{1} << 30;

// Reads an open file whole. Anything but a regular file fails with kNotARegularFile, a file of more than
// `maximumSize` bytes with EFBIG.
int readOpenFile(int fd, FileContents& contents, std::size_t maximumSize = kMaximumFileSize);
// A regular file at a path of the host, outside of the device root; links are followed. Never blocks:
// anything else fails with kNotARegularFile.
int openHostFile(const std::filesystem::path& path, FileDescriptor& file);
// The two in one.
int readHostFile(const std::filesystem::path& path, FileContents& contents,
                 std::size_t maximumSize = kMaximumFileSize);

int writeAll(int fd, std::span<const std::byte> bytes);
int writeAll(int fd, std::string_view text);

// Waits for an exclusive lock (flock) of the open file: 0, or EWOULDBLOCK when another holder kept it.
int waitForLock(int fd, double timeoutSeconds);

// 1 to 200 letters, digits, '.', '-', '_', not beginning with '.': a name that may become part of a file
// name.
bool isSafeName(std::string_view name);

}  // namespace tbdaily

// Files on the host: owned descriptors, whole reads, files that appear whole or not at all, locks between
// processes. Failures are errno values, 0 is success.
#pragma once

#include <sys/stat.h>

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace tbdaily {

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

// The identity of the file that the path leads to; nothing when there is none.
std::optional<FileIdentity> fileIdentity(const std::filesystem::path& path);

struct FileContents {
  std::vector<std::byte> bytes;
  // The file's, by which a later look may tell that it is unchanged; that of no file where it may not, since
  // the file had just been written and a second write could leave no trace in its times.
  FileIdentity identity;
};

inline constexpr std::size_t kMaximumFileSize = std::size_t{1} << 30;

// Reads a regular file whole. Anything else (a folder, a pipe) fails at once with EINVAL and never blocks; a
// file of more than `maximumSize` bytes fails with EFBIG.
int readRegularFile(const std::filesystem::path& path, FileContents& contents,
                    std::size_t maximumSize = kMaximumFileSize);

// Makes the folder and its missing parents, mode 0700.
int makeFolders(const std::filesystem::path& folder);

int writeAll(int fd, std::span<const std::byte> bytes);
int writeAll(int fd, std::string_view text);

// Forces a folder's entries to storage.
int syncFolder(const std::filesystem::path& folder);

// A file of mode 0600 that is written beside its place under a passing name and then put there; without that,
// its destructor removes it. Passing names begin with ".tmp-".
class TemporaryFile {
 public:
  static constexpr std::string_view kNamePrefix = ".tmp-";

  ~TemporaryFile();
  TemporaryFile() = default;
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;

  int create(const std::filesystem::path& folder);
  int fd() const { return fd_.get(); }
  const std::filesystem::path& path() const { return path_; }
  // Forces the contents to storage, then takes the place, replacing what is there.
  int replace(const std::filesystem::path& place);
  // The same, but fails with EEXIST where something is there.
  int placeNew(const std::filesystem::path& place);

 private:
  int sync();
  FileDescriptor fd_;
  std::filesystem::path path_;
};

// Replaces the file by one with these contents, atomically. Its folder must be there.
int replaceFile(const std::filesystem::path& place, std::string_view contents);

// An exclusive lock between processes on a file of its own, held until destruction. Waits 5 seconds for
// another holder.
class FileLock {
 public:
  // 0, or EWOULDBLOCK when the other holder kept it, or what opening the lock file failed with.
  int acquire(const std::filesystem::path& lockFile, double timeoutSeconds = 5.0);

 private:
  FileDescriptor fd_;
};

// 1 to 200 letters, digits, '.', '-', '_', not beginning with '.': a name that may become part of a file
// name.
bool isSafeName(std::string_view name);

}  // namespace tbdaily

// The one door to the files below the device root.
//
// Paths are absolute, as the device has them; ".." stops at the root. A symbolic link on the way is followed
// only when it belongs to root or to this process's user, and its target is looked up inside the root. What
// is read or written is a regular file, never a link in its place, a pipe or a device. Everything is opened
// from the root's descriptor, name by name where a link is on the way, and what was checked is what is used:
// names that somebody exchanges meanwhile lead nowhere else.
//
// Failures are errno values or a FileRefusal, 0 is success. Folders are made with mode 0700 and files with
// 0600 (the programs see to it that the umask takes nothing away); what root makes belongs to whom the folder
// around it belongs, what root replaces keeps its owner.
#pragma once

#include <sys/stat.h>

#include <filesystem>
#include <functional>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "platform/linux/base/file_io.h"

namespace tbdaily {

class DeviceFiles;

// An open folder of the device. What is done in it is done there, wherever its name leads meanwhile. Names
// are those of entries: no path. A link in the place of an entry is never followed.
class DeviceFolder {
 public:
  DeviceFolder() = default;

  bool isOpen() const { return descriptor_.isOpen(); }
  int descriptor() const { return descriptor_.get(); }
  // On the host, for messages alone.
  std::filesystem::path place(std::string_view name = {}) const;
  // A path that leads into this very folder for as long as it is open, for libraries that open files by path.
  std::filesystem::path throughDescriptor(std::string_view name) const;

  // All entries but "." and "..", in no order.
  int names(std::vector<std::string>& names) const;
  // Of the entry itself.
  int status(const std::string& name, struct stat& status) const;
  bool has(const std::string& name) const;
  // Whether a file may be put there: nothing has the name, or a regular file.
  int judgePlace(const std::string& name) const;

  int openForReading(const std::string& name, FileDescriptor& file) const;
  // At its end, made when it is missing; a file with a second name is refused. It is forced to storage with
  // makeDurable.
  int openForAppending(const std::string& name, FileDescriptor& file) const;
  // Made when it is missing; its contents are nobody's.
  int openForLocking(const std::string& name, FileDescriptor& file) const;
  // An empty file that is not opened; EEXIST when the name is taken.
  int makeFileUnopened(const std::string& name) const;
  // Makes the folder when it is missing, and opens it.
  int makeFolder(const std::string& name, DeviceFolder& folder) const;
  int openFolder(const std::string& name, DeviceFolder& folder) const;

  int remove(const std::string& name) const;
  // Takes the other's place where there is one.
  int rename(const std::string& name, const DeviceFolder& to, const std::string& newName) const;
  // Replaces the file by one with these contents, atomically.
  int replaceFile(const std::string& name, std::string_view contents) const;

  // Says that the folder's entries changed: makeDurable forces them to storage.
  void touch() const;
  // Forces them at once.
  int sync() const;

 private:
  friend class DeviceFiles;
  friend class TemporaryFile;
  int open(const std::string& name, int flags, FileDescriptor& file) const;
  enum class WrittenInPlace : bool { No, Yes };
  int openOrMake(const std::string& name, int flags, WrittenInPlace writtenInPlace,
                 FileDescriptor& file) const;
  // Gives what root made to the owner of this folder.
  void giveToOwner(int file) const;
  struct Owner {
    uid_t user = 0;
    gid_t group = 0;
  };
  Owner owner() const;

  const DeviceFiles* files_ = nullptr;
  FileDescriptor descriptor_;
  std::string path_;                    // on the device
  mutable std::optional<Owner> owner_;  // once it was asked for
};

// A file of mode 0600 that is written beside its place under a passing name and then put there; without that,
// its destructor removes it. Passing names begin with ".tmp-".
class TemporaryFile {
 public:
  static constexpr std::string_view kNamePrefix = ".tmp-";

  TemporaryFile() = default;
  ~TemporaryFile();
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;

  // Borrows the folder.
  int create(const DeviceFolder& folder);
  int fd() const { return fd_.get(); }
  // Forces the contents to storage, then takes the place, replacing a file that is there.
  int replace(const std::string& name);
  // The same, but fails with EEXIST where something is there.
  int placeNew(const std::string& name);

 private:
  const DeviceFolder* folder_ = nullptr;
  FileDescriptor fd_;
  std::string name_;  // empty when nothing is left to remove
};

// Removes the passing files that a killed process left in the folder. Nobody else may be writing there.
// Answers the names that are left.
std::vector<std::string> removePassingFiles(const DeviceFolder& folder);

// An exclusive lock between processes on a file of its own, held until destruction. Waits 5 seconds for
// another holder.
class FileLock {
 public:
  // 0, or EWOULDBLOCK when the other holder kept it, or what opening the lock file failed with.
  int acquire(const DeviceFolder& folder, const std::string& name, double timeoutSeconds = 5.0);
  bool isHeld() const { return fd_.isOpen(); }

 private:
  FileDescriptor fd_;
};

class DeviceFiles {
 public:
  explicit DeviceFiles(std::filesystem::path root) : root_(std::move(root)) {}

  const std::filesystem::path& root() const { return root_; }
  // Where the path lies on the host when no link is on the way: for messages alone.
  std::filesystem::path place(std::string_view path) const;

  // 0, or why the root cannot be opened. Everything else then fails with kUnusableRoot, and names it on
  // standard error.
  int examineRoot() const;

  int openForReading(std::string_view path, FileDescriptor& file) const;
  int readFile(std::string_view path, FileContents& contents,
               std::size_t maximumSize = kMaximumFileSize) const;
  // The same for a file below a folder; kOutside where "..", or a link, leads out of that.
  int readFileBelow(std::string_view folder, std::string_view file, FileContents& contents) const;
  // Of what the path leads to.
  int status(std::string_view path, struct stat& status) const;
  // Whether the path still leads to the file of this identity, at the price of one look. False says nothing:
  // ask again.
  bool isUnchanged(std::string_view path, const FileIdentity& identity) const;

  int openFolder(std::string_view path, DeviceFolder& folder) const;
  // Makes it and its missing parents; never the root itself.
  int makeFolder(std::string_view path, DeviceFolder& folder) const;

  // Opens a regular file when the judge has no complaint about any folder and link on the way or the file
  // itself. `complaint` holds the first one, with its place; empty when the file is not there.
  using Judge = std::function<std::string(const struct stat&)>;
  int openJudged(std::string_view path, const Judge& judge, FileDescriptor& file,
                 std::string& complaint) const;

  // Forces to storage all that was written through this door, and the folders that name it. What fails is
  // named; false then.
  bool makeDurable() const;

 private:
  friend class DeviceFolder;
  int open(std::string_view path, int flags, FileDescriptor& file) const;
  // What a walk along the names of a path asks of them.
  struct Rules {
    const Judge* judge = nullptr;
    std::string* complaint = nullptr;    // the judge's
    const struct stat* fence = nullptr;  // a folder that the way must lead through
  };
  int walk(std::string_view path, int flags, const Rules& rules, FileDescriptor& file) const;
  int openRoot(int& descriptor) const;
  int openRootDescriptor() const;
  void rememberToSync(const std::string& path, bool isFolder) const;

  std::filesystem::path root_;
  mutable std::mutex mutex_;  // over what follows
  mutable FileDescriptor rootDescriptor_;
  mutable std::set<std::string> touchedFolders_, touchedFiles_;
};

}  // namespace tbdaily

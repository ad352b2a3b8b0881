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

#include <atomic>
#include <filesystem>
#include <functional>
#include <mutex>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "platform/linux/base/device_folder.h"
#include "platform/linux/base/file_io.h"

namespace tbdaily {

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

  // For what is there and cannot be read, or not be used once it was read: such a thing is not missing. One
  // line on standard error, once, as noteOnce; whether there was any, and the first of them.
  void noteUnread(const std::string& line) const;
  bool hasUnread() const { return hasUnread_; }
  std::vector<std::string> unread() const;

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
  mutable std::atomic<bool> hasUnread_ = false;
  mutable std::mutex mutex_;  // over what follows
  mutable FileDescriptor rootDescriptor_;
  mutable std::set<std::string> touchedFolders_, touchedFiles_;
  mutable std::vector<std::string> unread_;  // each once, and not too many
};

}  // namespace tbdaily

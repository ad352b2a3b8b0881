// An open folder of the device.
#pragma once

#include <sys/stat.h>

#include <filesystem>
#include <optional>
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

}  // namespace tbdaily

// What the host layer knows of the machine that it runs on: where the device's file tree lies, whether live
// sources may be asked, and the one way in which it tells an administrator about trouble.
#pragma once

#include <filesystem>
#include <mutex>
#include <set>
#include <string>
#include <string_view>

namespace tbdaily {

class Host {
 public:
  // `root` holds the device's file tree. `liveRoot` is where live sources are read, "/" outside of tests.
  Host(std::filesystem::path root, bool live, std::filesystem::path liveRoot = "/");

  // From TBDAILY_ROOT (unset or empty: "/") and TBDAILY_LIVE ("0" switches the live sources off).
  static Host fromEnvironment();

  const std::filesystem::path& root() const { return root_; }
  bool live() const { return live_; }

  // The place on the host of an absolute path of the device. "..", as a component, cannot leave the root.
  std::filesystem::path devicePath(std::string_view absolutePath) const;
  // The place of a live source given by its absolute path.
  std::filesystem::path livePath(std::string_view absolutePath) const;

  // Makes a folder below the root and its missing parents, mode 0700; never the root itself. 0 or an errno
  // value.
  int makeFolders(const std::filesystem::path& folder) const;

  // One line on standard error, prefixed by the program's name. The same line is written once in the life of
  // a process, and no more than a thousand altogether.
  static void noteOnce(const std::string& line);
  // For a file or folder that could not be written: one line for each kind of failure in the life of a
  // process, since a root that cannot be written fails every write in the same way.
  static void noteWriteFailure(const std::filesystem::path& path, int error);

 private:
  std::filesystem::path root_;
  bool live_;
  std::filesystem::path liveRoot_;
};

// "permission denied" and the like, for an errno value.
std::string errorText(int error);

}  // namespace tbdaily

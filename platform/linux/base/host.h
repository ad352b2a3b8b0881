// What the host layer knows of the machine that it runs on: where the device's file tree lies, and whether
// live sources may be asked.
#pragma once

#include <filesystem>
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

 private:
  std::filesystem::path root_;
  bool live_;
  std::filesystem::path liveRoot_;
};

}  // namespace tbdaily

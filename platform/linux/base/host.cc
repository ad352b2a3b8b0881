#include "platform/linux/base/host.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstdlib>
#include <utility>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace fs = std::filesystem;

namespace {
fs::path below(const fs::path& base, std::string_view absolutePath) {
  return base / (fs::path("/") / absolutePath).lexically_normal().relative_path();
}

}  // namespace

Host::Host(fs::path root, bool live, fs::path liveRoot)
    : root_(std::move(root)), live_(live), liveRoot_(std::move(liveRoot)) {}

Host Host::fromEnvironment() {
  const char* root = std::getenv("TBDAILY_ROOT");
  const char* live = std::getenv("TBDAILY_LIVE");
  std::error_code ignored;
  fs::path path = root != nullptr && *root != '\0' ? fs::absolute(root, ignored) : fs::path("/");
  return {std::move(path), live == nullptr || std::string_view(live) != "0"};
}

fs::path Host::devicePath(std::string_view absolutePath) const {
  return below(root_, absolutePath);
}
fs::path Host::livePath(std::string_view absolutePath) const {
  return below(liveRoot_, absolutePath);
}

int Host::makeFolders(const fs::path& folder) const {
  struct stat status {};
  if (::stat(folder.c_str(), &status) == 0) return S_ISDIR(status.st_mode) ? 0 : ENOTDIR;
  const int error = ::stat(root_.c_str(), &status) != 0 ? errno : S_ISDIR(status.st_mode) ? 0 : ENOTDIR;
  if (error == 0) return tbdaily::makeFolders(folder);
  noteUnusableRoot(root_, error);
  return error;
}

}  // namespace tbdaily

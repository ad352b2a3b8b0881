#include "platform/linux/host.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>  // program_invocation_short_name too
#include <cstdlib>
#include <utility>

#include "platform/linux/file_io.h"

namespace tbdaily {

namespace fs = std::filesystem;

namespace {
// A peer or a file can cause as many different lines as it likes.
constexpr std::size_t kMostNotes = 1000;

fs::path below(const fs::path& base, std::string_view absolutePath) {
  return base / (fs::path("/") / absolutePath).lexically_normal().relative_path();
}

// Of the failures to write that this process met.
bool isFirstOfKind(int error) {
  static std::mutex mutex;
  static std::set<int> kinds;
  const std::lock_guard lock(mutex);
  return kinds.insert(error).second;
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

void Host::noteOnce(const std::string& line) {
  static std::mutex mutex;
  static std::set<std::string> written;
  const std::lock_guard lock(mutex);
  if (written.size() >= kMostNotes || !written.insert(line).second) return;
  std::string text(program_invocation_short_name);
  text.append(": ").append(line);
  for (char& c : text) {
    // What a line quotes may come from outside.
    if ((c >= '\0' && c < ' ') || c == '\x7f') c = ' ';
  }
  text += '\n';
  // A standard error that cannot be written leaves nobody to tell.
  [[maybe_unused]] const ssize_t count = ::write(STDERR_FILENO, text.data(), text.size());
}

int Host::makeFolders(const fs::path& folder) const {
  struct stat status {};
  const int error = ::stat(root_.c_str(), &status) != 0 ? errno : S_ISDIR(status.st_mode) ? 0 : ENOTDIR;
  if (error == 0) return tbdaily::makeFolders(folder);
  if (isFirstOfKind(error))
    noteOnce("the device root " + root_.native() + " cannot be used: " + errorText(error));
  return error;
}

void Host::noteWriteFailure(const fs::path& path, int error) {
  if (!isFirstOfKind(error)) return;
  noteOnce("cannot write " + path.native() + ": " +
           (error == EWOULDBLOCK ? "another program keeps it locked" : errorText(error)));
}

std::string errorText(int error) {
  std::string text = std::generic_category().message(error);
  if (!text.empty() && text[0] >= 'A' && text[0] <= 'Z' && text.size() > 1 && text[1] >= 'a') {
    text[0] = static_cast<char>(text[0] - 'A' + 'a');
  }
  return text;
}

}  // namespace tbdaily

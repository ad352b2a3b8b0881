#include "platform/linux/base/host_notes.h"

#include <unistd.h>

#include <cerrno>  // program_invocation_short_name too
#include <mutex>
#include <set>
#include <system_error>

#include "platform/linux/base/file_io.h"
#include "platform/utf8.h"

namespace tbdaily {

namespace {

// A peer or a file can cause as many different lines as it likes.
constexpr std::size_t kMostNotes = 1000;

// Of the failures to write that this process met.
bool isFirstOfKind(int error) {
  static std::mutex mutex;
  static std::set<int> kinds;
  const std::lock_guard lock(mutex);
  return kinds.insert(error).second;
}

}  // namespace

void noteOnce(const std::string& line) {
  static std::mutex mutex;
  static std::set<std::string> written;
  const std::lock_guard lock(mutex);
  if (written.size() >= kMostNotes || !written.insert(line).second) return;
  std::string text(program_invocation_short_name);
  text.append(": ").append(line);
  text = withoutControls(text, TextPlace::Line).append("\n");  // what it quotes may come from outside
  // A standard error that cannot be written leaves nobody to tell.
  [[maybe_unused]] const ssize_t count = ::write(STDERR_FILENO, text.data(), text.size());
}

void noteWriteFailure(const std::filesystem::path& path, int error) {
  if (error == kUnusableRoot) return;
  const bool isRefusal = error >= kForeignLink;  // the place matters, each time
  if (!isRefusal && !isFirstOfKind(error)) return;
  noteOnce("cannot write " + path.native() + ": " +
           (error == EWOULDBLOCK ? "another program keeps it locked" : errorText(error)));
}

void noteUnusableRoot(const std::filesystem::path& root, int error) {
  if (!isFirstOfKind(error)) return;
  noteOnce("the device root " + root.native() + " cannot be used: " + errorText(error));
}

std::string errorText(int error) {
  switch (error) {
    case kForeignLink:
      return "a symbolic link of another user is on the way";
    case kLinkInPlace:
      return "a symbolic link is in its place";
    case kNotARegularFile:
      return "it is not a regular file";
    case kSecondName:
      return "the file has a second name";
    case kOutside:
      return "it leads out of its folder";
    case kUnusableRoot:
      return "the device root cannot be used";
    default:
      break;
  }
  std::string text = std::generic_category().message(error);
  if (!text.empty() && text[0] >= 'A' && text[0] <= 'Z' && text.size() > 1 && text[1] >= 'a') {
    text[0] = static_cast<char>(text[0] - 'A' + 'a');
  }
  return text;
}

}  // namespace tbdaily

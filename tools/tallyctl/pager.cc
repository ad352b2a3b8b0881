#include "tools/tallyctl/pager.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>

namespace tbdaily {

namespace {

constexpr const char* kUsualPager = "less";

const char* command() {
  const char* chosen = std::getenv("PAGER");
  return chosen != nullptr ? chosen : kUsualPager;
}

// In the child: gives the shell the command, with colours let through where less is told nothing else.
[[noreturn]] void runCommand(int input) {
  ::dup2(input, STDIN_FILENO);
  ::setenv("LESS", "FRX", 0);
  ::signal(SIGINT, SIG_DFL);
  ::execl("/bin/sh", "sh", "-c", command(), nullptr);
  ::_exit(127);
}

// Whether the shell would find it: what cannot be run must not swallow the text.
bool isThere() {
  const std::string test =
      "command -v " + std::string(command()).substr(0, std::string(command()).find(' ')) + " >/dev/null 2>&1";
  return std::system(test.c_str()) == 0;
}

}  // namespace

bool Pager::isWanted() {
  const std::string_view chosen = command();
  return !chosen.empty() && chosen != "cat";
}

bool Pager::start() {
  std::array<int, 2> ends{};
  if (!isThere() || ::pipe2(ends.data(), O_CLOEXEC) != 0) return false;
  process_ = ::fork();
  if (process_ == 0) runCommand(ends[0]);
  ::close(ends[0]);
  if (process_ < 0) {
    ::close(ends[1]);
    return false;
  }
  input_ = ends[1];
  // A reader that leaves early ends the text, not the command; an interrupt is the pager's.
  ::signal(SIGPIPE, SIG_IGN);
  ::signal(SIGINT, SIG_IGN);
  return true;
}

void Pager::write(std::string_view text) {
  while (input_ >= 0 && !text.empty()) {
    const ssize_t written = ::write(input_, text.data(), text.size());
    if (written < 0 && errno == EINTR) continue;
    if (written < 0) {
      ::close(input_);
      input_ = -1;
      return;
    }
    text.remove_prefix(static_cast<std::size_t>(written));
  }
}

void Pager::finish() {
  if (input_ >= 0) ::close(input_);
  input_ = -1;
  if (process_ <= 0) return;
  while (::waitpid(process_, nullptr, 0) < 0 && errno == EINTR) {
  }
  process_ = -1;
}

}  // namespace tbdaily

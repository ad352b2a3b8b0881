#include "tools/tallyctl/stop_signals.h"

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <ctime>

namespace tbdaily {

namespace {

volatile std::sig_atomic_t stopAsked = 0;  // a handler has nothing else to write to

void askToStop(int) {
  stopAsked = 1;
}

// Keeps the signals back, so that none comes between the question whether one came and the sleep.
class HeldSignals {
 public:
  HeldSignals() {
    sigset_t held;
    sigemptyset(&held);
    sigaddset(&held, SIGINT);
    sigaddset(&held, SIGTERM);
    sigprocmask(SIG_BLOCK, &held, &before_);
  }
  ~HeldSignals() { sigprocmask(SIG_SETMASK, &before_, nullptr); }
  HeldSignals(const HeldSignals&) = delete;
  HeldSignals& operator=(const HeldSignals&) = delete;

  const sigset_t& before() const { return before_; }

 private:
  sigset_t before_{};
};

}  // namespace

StopSignals::StopSignals() {
  stopAsked = 0;
  for (std::size_t i = 0; i < kSignals.size(); ++i) {
    struct sigaction action {};
    sigemptyset(&action.sa_mask);
    action.sa_handler = kSignals[i] == SIGPIPE ? SIG_IGN : askToStop;
    sigaction(kSignals[i], &action, &before_[i]);
  }
}

StopSignals::~StopSignals() {
  for (std::size_t i = 0; i < kSignals.size(); ++i) sigaction(kSignals[i], &before_[i], nullptr);
}

bool StopSignals::haveCome() const {
  return stopAsked != 0;
}

WaitEnd StopSignals::sleepUntil(std::chrono::steady_clock::time_point time) const {
  return sleep(time, false);
}

WaitEnd StopSignals::sleepUntilInput(std::chrono::steady_clock::time_point time) const {
  return sleep(time, true);
}

WaitEnd StopSignals::sleep(std::chrono::steady_clock::time_point time, bool alsoInput) const {
  using std::chrono::nanoseconds, std::chrono::seconds;
  const HeldSignals held;
  while (!haveCome()) {
    const auto left = std::max(
        std::chrono::duration_cast<nanoseconds>(time - std::chrono::steady_clock::now()), nanoseconds(0));
    const auto whole = std::chrono::floor<seconds>(left);
    const timespec timeout{whole.count(), (left - whole).count()};
    // Asks nothing of the output: a closed pipe reports itself.
    std::array<pollfd, 2> files{{{STDOUT_FILENO, 0, 0}, {STDIN_FILENO, POLLIN, 0}}};
    const int ready = ::ppoll(files.data(), alsoInput ? 2 : 1, &timeout, &held.before());
    if (ready > 0)
      return files[0].revents == 0 && files[1].revents == POLLIN ? WaitEnd::Input : WaitEnd::ReaderGone;
    if (ready == 0 || errno != EINTR) return WaitEnd::Done;
    if (alsoInput && !haveCome()) return WaitEnd::Input;
  }
  return WaitEnd::Stopped;
}

WaitEnd StopSignals::write(std::string_view text) const {
  const HeldSignals held;
  while (!text.empty()) {
    if (haveCome()) return WaitEnd::Stopped;
    pollfd output{STDOUT_FILENO, POLLOUT, 0};
    if (::ppoll(&output, 1, nullptr, &held.before()) < 0) {
      if (errno == EINTR) continue;
      return WaitEnd::Failed;
    }
    // A pipe that is ready takes this much without making its writer wait.
    const ssize_t written = ::write(STDOUT_FILENO, text.data(), std::min<std::size_t>(text.size(), PIPE_BUF));
    if (written >= 0) {
      text.remove_prefix(static_cast<std::size_t>(written));
    } else if (errno != EAGAIN) {
      return errno == EPIPE ? WaitEnd::ReaderGone : WaitEnd::Failed;
    }
  }
  return WaitEnd::Done;
}

}  // namespace tbdaily

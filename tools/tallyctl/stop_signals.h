// For commands that go on until they are told to end.
#pragma once

#include <array>
#include <chrono>
#include <csignal>
#include <cstdint>
#include <string_view>

namespace tbdaily {

enum class WaitEnd : std::uint8_t { Done, Stopped, ReaderGone, Failed, Input };

// As long as it lives, SIGINT and SIGTERM no longer end the process but ask the command to end, and writing
// to a closed pipe fails instead of ending the process. One at a time.
class StopSignals {
 public:
  StopSignals();
  ~StopSignals();
  StopSignals(const StopSignals&) = delete;
  StopSignals& operator=(const StopSignals&) = delete;

  bool haveCome() const;
  // Sleeps until the time has come, a signal has, or nobody reads standard output any more.
  WaitEnd sleepUntil(std::chrono::steady_clock::time_point time) const;
  // The same; ends with Input when a key was pressed or the window changed.
  WaitEnd sleepUntilInput(std::chrono::steady_clock::time_point time) const;
  // Writes the text to standard output, past stdio, and waits for a reader that stands still no longer than
  // until a signal comes.
  WaitEnd write(std::string_view text) const;

 private:
  WaitEnd sleep(std::chrono::steady_clock::time_point time, bool alsoInput) const;

  static constexpr std::array kSignals = {SIGINT, SIGTERM, SIGPIPE};
  std::array<struct sigaction, kSignals.size()> before_{};
};

}  // namespace tbdaily

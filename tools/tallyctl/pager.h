// A pager for what is longer than the screen.
#pragma once

#include <sys/types.h>

#include <string>
#include <string_view>

namespace tbdaily {

// Runs $PAGER, or less. What is written to it after its reader has left is dropped.
class Pager {
 public:
  Pager() = default;
  ~Pager() { finish(); }
  Pager(const Pager&) = delete;
  Pager& operator=(const Pager&) = delete;

  // Whether there is one to run: not where PAGER is set to nothing or to "cat".
  static bool isWanted();
  // False when it cannot be started: nothing has been written then.
  bool start();
  bool isRunning() const { return process_ > 0; }
  void write(std::string_view text);
  // Waits until its reader has seen enough.
  void finish();

 private:
  pid_t process_ = -1;
  int input_ = -1;
};

}  // namespace tbdaily

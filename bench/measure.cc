// Runs a command and says what it took: the processor's seconds, the seconds on the clock, the peak of its
// memory.
//
// usage: measure COMMAND [ARGUMENT...]
//
// Prints "<user and system seconds> <elapsed seconds> <peak in bytes>" and ends with the command's status. A
// program of its own, since a command inherits the peak of whoever starts it, and this one is small.
#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>

#include <chrono>
#include <cstdio>

extern char** environ;

namespace {
double secondsOf(const timeval& time) {
  return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) * 1e-6;
}
}  // namespace

int main(int argc, char** argv) {
  if (argc < 2) return 2;
  const auto begin = std::chrono::steady_clock::now();
  pid_t command = 0;
  posix_spawn_file_actions_t actions;
  ::posix_spawn_file_actions_init(&actions);
  ::posix_spawn_file_actions_addopen(&actions, 1, "/dev/null", O_WRONLY, 0);
  if (::posix_spawnp(&command, argv[1], &actions, nullptr, argv + 1, environ) != 0) return 127;
  int status = 0;
  rusage usage{};
  if (::wait4(command, &status, 0, &usage) != command) return 127;
  const std::chrono::duration<double> elapsed = std::chrono::steady_clock::now() - begin;
  std::printf("%.6f %.6f %ld\n", secondsOf(usage.ru_utime) + secondsOf(usage.ru_stime), elapsed.count(),
              usage.ru_maxrss * 1024);
  return WIFEXITED(status) ? WEXITSTATUS(status) : 127;
}

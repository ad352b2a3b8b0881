#include "platform/linux/base/process_start.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

namespace tbdaily {

namespace {
mode_t startMask = 022;
}  // namespace

void prepareProcess() {
  for (int fd = STDIN_FILENO; fd <= STDERR_FILENO; ++fd) {
    if (::fcntl(fd, F_GETFD) >= 0 || errno != EBADF) continue;
    // The lowest free number is this one. Without /dev/null a number of its own still keeps files away from
    // it.
    const int opened = ::open("/dev/null", O_RDWR);
    if (opened < 0 && ::open("/", O_PATH) < 0) std::abort();
  }
  startMask = ::umask(077);
}

mode_t umaskAtStart() {
  return startMask;
}

}  // namespace tbdaily

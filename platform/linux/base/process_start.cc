#include "platform/linux/base/process_start.h"

#include <fcntl.h>
#include <malloc.h>
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
  // Memory that was freed is wanted again in a moment: without this a load of rows asks the kernel for the
  // same pages tens of thousands of times.
  ::mallopt(M_MMAP_THRESHOLD, 1 << 20);
  ::mallopt(M_TRIM_THRESHOLD, 4 << 20);
  ::mallopt(M_TOP_PAD, 1 << 18);
}

mode_t umaskAtStart() {
  return startMask;
}

}  // namespace tbdaily

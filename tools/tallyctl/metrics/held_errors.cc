#include "tools/tallyctl/metrics/held_errors.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <array>

namespace tbdaily {

HeldErrors::HeldErrors()
    : before_(::fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, STDERR_FILENO + 1)),
      held_(::memfd_create("tallyctl-errors", MFD_CLOEXEC)) {
  if (before_.isOpen() && held_.isOpen() && ::dup2(held_.get(), STDERR_FILENO) < 0) held_.reset();
}

HeldErrors::~HeldErrors() {
  if (!before_.isOpen() || !held_.isOpen() || ::dup2(before_.get(), STDERR_FILENO) < 0) return;
  std::array<char, 4096> text;
  ::lseek(held_.get(), 0, SEEK_SET);
  for (ssize_t length = 0; (length = ::read(held_.get(), text.data(), text.size())) > 0;) {
    if (::write(STDERR_FILENO, text.data(), static_cast<std::size_t>(length)) != length) return;
  }
}

}  // namespace tbdaily

#include "tools/tallyctl/output_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/file_judgement.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/base/process_start.h"

namespace tbdaily {

namespace {

// A pipe that nobody reads gives ENXIO instead of a wait for a reader; with one it takes as long as that
// takes.
int writeInPlace(const std::string& path, std::span<const std::byte> bytes) {
  const FileDescriptor file(::open(path.c_str(), O_WRONLY | kOpenFile));
  if (!file.isOpen()) return errno;
  const int flags = ::fcntl(file.get(), F_GETFL);
  if (flags < 0 || ::fcntl(file.get(), F_SETFL, flags & ~O_NONBLOCK) != 0) return errno;
  return writeAll(file.get(), bytes);
}

int replaceWhole(const std::string& path, std::span<const std::byte> bytes) {
  std::string passing = path + ".XXXXXX";
  const FileDescriptor file(::mkostemp(passing.data(), O_CLOEXEC));
  if (!file.isOpen()) return errno;
  int error = writeAll(file.get(), bytes);
  if (error == 0 && ::fchmod(file.get(), 0666 & ~umaskAtStart()) != 0) error = errno;
  if (error == 0 && ::rename(passing.c_str(), path.c_str()) != 0) error = errno;
  if (error != 0) ::unlink(passing.c_str());
  return error;
}

}  // namespace

Outcome<Nothing> writeOutputFile(const std::string& path, std::span<const std::byte> bytes) {
  if (path == "-") {
    const int error = writeAll(STDOUT_FILENO, bytes);
    return error == 0 ? Outcome<Nothing>(Nothing{})
                      : Failure{"standard output cannot be written: " + errorText(error)};
  }
  struct stat there {};
  const bool isOther = ::lstat(path.c_str(), &there) == 0 && !S_ISREG(there.st_mode);
  if (const int error = isOther ? writeInPlace(path, bytes) : replaceWhole(path, bytes); error != 0)
    return Failure{path + ": " + (error == ENXIO ? "nobody reads it" : errorText(error))};
  return Nothing{};
}

}  // namespace tbdaily

#include "tools/tallyctl/output_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/file_judgement.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/base/process_start.h"

namespace tbdaily {

namespace {

constexpr mode_t kReadableByAll = 0644;

// A pipe that nobody reads gives ENXIO instead of a wait for a reader; with one it takes as long as that
// takes.
int openInPlace(const std::string& path, FileDescriptor& file) {
  file = FileDescriptor(::open(path.c_str(), O_WRONLY | kOpenFile));
  if (!file.isOpen()) return errno;
  const int flags = ::fcntl(file.get(), F_GETFL);
  return flags < 0 || ::fcntl(file.get(), F_SETFL, flags & ~O_NONBLOCK) != 0 ? errno : 0;
}

}  // namespace

OutputFile::~OutputFile() {
  if (!passing_.empty()) ::unlink(passing_.c_str());
}

Outcome<Nothing> OutputFile::open(const std::string& path, OutputMode mode) {
  path_ = place_ = path;
  mode_ = mode;
  if (path == "-") return Nothing{};
  struct stat there {};
  if (::stat(path.c_str(), &there) == 0) {
    if (!S_ISREG(there.st_mode)) return outcomeOf(openInPlace(path, file_));
    std::error_code error;
    const std::filesystem::path target = std::filesystem::canonical(path, error);
    if (!error) place_ = target.native();
  }
  std::string passing = place_ + ".XXXXXX";
  file_ = FileDescriptor(::mkostemp(passing.data(), O_CLOEXEC));
  if (!file_.isOpen()) return outcomeOf(errno);
  passing_ = passing;
  return Nothing{};
}

Outcome<Nothing> OutputFile::write(std::span<const std::byte> bytes) {
  return outcomeOf(writeAll(file_.isOpen() ? file_.get() : STDOUT_FILENO, bytes));
}

Outcome<Nothing> OutputFile::finish() {
  if (passing_.empty()) return Nothing{};
  const mode_t mode = mode_ == OutputMode::ReadableByAll ? kReadableByAll : 0666 & ~umaskAtStart();
  if (::fchmod(file_.get(), mode) != 0 || ::rename(passing_.c_str(), place_.c_str()) != 0)
    return outcomeOf(errno);
  passing_.clear();
  return Nothing{};
}

Outcome<Nothing> OutputFile::outcomeOf(int error) const {
  if (error == 0) return Nothing{};
  if (path_ == "-") return Failure{"standard output cannot be written: " + errorText(error)};
  return Failure{path_ + ": " + (error == ENXIO ? "nobody reads it" : errorText(error))};
}

Outcome<Nothing> writeOutputFile(const std::string& path, std::span<const std::byte> bytes) {
  OutputFile file;
  if (auto opened = file.open(path, OutputMode::Users); !opened) return opened;
  if (auto written = file.write(bytes); !written) return written;
  return file.finish();
}

}  // namespace tbdaily

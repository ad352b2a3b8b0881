// Files that the user wants something written to.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>

#include "platform/linux/base/file_io.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

enum class OutputMode : std::uint8_t {
  Users,         // what the user's umask leaves of 0666
  ReadableByAll  // 0644: for a program of another user
};

// Written piece by piece: a regular file appears whole at the end or stays as it was. A symbolic link leads
// to the file that is replaced; what else the path names (a pipe, a device) is written to, and "-" is
// standard output. Failures name the path.
class OutputFile {
 public:
  OutputFile() = default;
  ~OutputFile();  // removes what was not placed
  OutputFile(const OutputFile&) = delete;
  OutputFile& operator=(const OutputFile&) = delete;

  Outcome<Nothing> open(const std::string& path, OutputMode mode);
  Outcome<Nothing> write(std::span<const std::byte> bytes);
  // Puts the file in its place.
  Outcome<Nothing> finish();

 private:
  Outcome<Nothing> outcomeOf(int error) const;

  std::string path_, passing_;  // as the user names it; the file that is written, where that is another
  std::string place_;           // which it then takes
  OutputMode mode_ = OutputMode::Users;
  FileDescriptor file_;
};

// All at once.
Outcome<Nothing> writeOutputFile(const std::string& path, std::span<const std::byte> bytes);

}  // namespace tbdaily

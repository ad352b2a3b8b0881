// Files of the device, by the absolute paths that the device uses.
//
// Absent: no file exists.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

namespace tbdaily {

struct FileStatus {
  std::int64_t size = 0;  // bytes
};

class FileSystem {
 public:
  virtual ~FileSystem() = default;
  // Nothing when the path does not exist or cannot be examined.
  virtual std::optional<FileStatus> status(std::string_view path) = 0;
  // All bytes of a regular file; nothing when it cannot be read, or is something else.
  virtual std::optional<std::vector<std::byte>> readFile(std::string_view path) = 0;
  // Forces to storage everything that this process wrote to the device so far, and the folders that name it.
  // False when that was not possible, which has been said on standard error.
  virtual bool makeDurable() = 0;
};

}  // namespace tbdaily

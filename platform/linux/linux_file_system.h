// The device's files.
#pragma once

#include "platform/file_system.h"
#include "platform/linux/base/host.h"

namespace tbdaily {

class LinuxFileSystem : public FileSystem {
 public:
  explicit LinuxFileSystem(const Host& host) : host_(host) {}
  std::optional<FileStatus> status(std::string_view path) override;
  std::optional<std::vector<std::byte>> readFile(std::string_view path) override;
  bool makeDurable() override { return host_.files().makeDurable(); }

 private:
  const Host& host_;
};

}  // namespace tbdaily

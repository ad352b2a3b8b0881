// The device's files, its run-time libraries, and digests.
#pragma once

#include "platform/dynamic_loader.h"
#include "platform/file_system.h"
#include "platform/linux/host.h"
#include "platform/message_digest.h"

namespace tbdaily {

class LinuxFileSystem : public FileSystem {
 public:
  explicit LinuxFileSystem(const Host& host) : host_(host) {}
  std::optional<FileStatus> status(std::string_view path) override;
  std::optional<std::vector<std::byte>> readFile(std::string_view path) override;

 private:
  const Host& host_;
};

// Opens a library only when it and its folder belong to root or to the job's user and nobody else can write
// to them: what is loaded runs with the job's rights.
class LinuxDynamicLoader : public DynamicLoader {
 public:
  explicit LinuxDynamicLoader(const Host& host) : host_(host) {}
  LibraryHandle open(std::string_view path) override;
  void* symbol(LibraryHandle library, const std::string& name) override;

 private:
  const Host& host_;
};

class LinuxMessageDigest : public MessageDigest {
 public:
  Md5Digest md5(std::span<const std::byte> bytes) override;
};

}  // namespace tbdaily

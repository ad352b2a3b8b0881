#include "platform/linux/linux_file_system.h"

#include <dlfcn.h>
#include <md5.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "platform/linux/file_io.h"

namespace tbdaily {

namespace {

// Why a file or folder must not be trusted with code that the job runs; empty when it may.
std::string whyUntrusted(const std::filesystem::path& path) {
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0) return errorText(errno);
  if (status.st_uid != 0 && status.st_uid != ::geteuid()) return "it belongs to another user";
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) return "others can write to it";
  return {};
}

}  // namespace

std::optional<FileStatus> LinuxFileSystem::status(std::string_view path) {
  struct stat status {};
  if (::stat(host_.devicePath(path).c_str(), &status) != 0) return std::nullopt;
  return FileStatus{status.st_size};
}

std::optional<std::vector<std::byte>> LinuxFileSystem::readFile(std::string_view path) {
  const std::filesystem::path place = host_.devicePath(path);
  FileContents contents;
  if (const int error = readRegularFile(place, contents); error != 0) {
    if (error != ENOENT) Host::noteOnce("cannot read " + place.native() + ": " + errorText(error));
    return std::nullopt;
  }
  return std::move(contents.bytes);
}

LibraryHandle LinuxDynamicLoader::open(std::string_view path) {
  std::error_code error;
  const std::filesystem::path named = host_.devicePath(path);
  const std::filesystem::path place = std::filesystem::canonical(named, error);
  if (error || !std::filesystem::is_regular_file(place, error)) return nullptr;
  // Where the name is a link, whoever can replace that chooses the library too.
  for (const std::filesystem::path& checked : {place, place.parent_path(), named.parent_path()}) {
    if (const std::string reason = whyUntrusted(checked); !reason.empty()) {
      Host::noteOnce("library " + place.native() + " is not loaded: " + checked.native() + ": " + reason);
      return nullptr;
    }
  }
  void* library = ::dlopen(place.c_str(), RTLD_LAZY | RTLD_LOCAL);
  if (library == nullptr) Host::noteOnce("library " + place.native() + " is not loaded: " + ::dlerror());
  return library;
}

void* LinuxDynamicLoader::symbol(LibraryHandle library, const std::string& name) {
  return library != nullptr ? ::dlsym(library, name.c_str()) : nullptr;
}

Md5Digest LinuxMessageDigest::md5(std::span<const std::byte> bytes) {
  MD5_CTX context;
  ::MD5Init(&context);
  ::MD5Update(&context, reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size());
  std::array<std::uint8_t, MD5_DIGEST_LENGTH> result{};
  ::MD5Final(result.data(), &context);
  Md5Digest digest;
  for (std::size_t i = 0; i < digest.size(); ++i) digest[i] = static_cast<std::byte>(result[i]);
  return digest;
}

}  // namespace tbdaily

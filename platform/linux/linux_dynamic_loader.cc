#include "platform/linux/linux_dynamic_loader.h"

#include <dlfcn.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "platform/linux/base/host_notes.h"

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

LibraryHandle LinuxDynamicLoader::open(std::string_view path) {
  std::error_code error;
  const std::filesystem::path named = host_.devicePath(path);
  const std::filesystem::path place = std::filesystem::canonical(named, error);
  if (error || !std::filesystem::is_regular_file(place, error)) return nullptr;
  // Where the name is a link, whoever can replace that chooses the library too.
  for (const std::filesystem::path& checked : {place, place.parent_path(), named.parent_path()}) {
    if (const std::string reason = whyUntrusted(checked); !reason.empty()) {
      noteOnce("library " + place.native() + " is not loaded: " + checked.native() + ": " + reason);
      return nullptr;
    }
  }
  void* library = ::dlopen(place.c_str(), RTLD_LAZY | RTLD_LOCAL);
  if (library == nullptr) noteOnce("library " + place.native() + " is not loaded: " + ::dlerror());
  return library;
}

void* LinuxDynamicLoader::symbol(LibraryHandle library, const std::string& name) {
  return library != nullptr ? ::dlsym(library, name.c_str()) : nullptr;
}

}  // namespace tbdaily

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
std::string whyUntrusted(const struct stat& status) {
  if (status.st_uid != 0 && status.st_uid != ::geteuid()) return "it belongs to another user";
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) return "others can write to it";
  return {};
}

}  // namespace

LibraryHandle LinuxDynamicLoader::open(std::string_view path) {
  const std::string place = host_.files().place(path).native();
  FileDescriptor file;
  std::string complaint;
  if (host_.files().openJudged(path, whyUntrusted, file, complaint) != 0) {
    if (!complaint.empty()) noteOnce("library " + place + " is not loaded: " + complaint);
    return nullptr;
  }
  // The very file that was judged, whatever has its name by now.
  const std::string judged = "/proc/self/fd/" + std::to_string(file.get());
  void* library = ::dlopen(judged.c_str(), RTLD_LAZY | RTLD_LOCAL);
  if (library == nullptr) noteOnce("library " + place + " is not loaded: " + ::dlerror());
  return library;
}

void* LinuxDynamicLoader::symbol(LibraryHandle library, const std::string& name) {
  return library != nullptr ? ::dlsym(library, name.c_str()) : nullptr;
}

}  // namespace tbdaily

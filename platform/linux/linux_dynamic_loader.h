// Run-time libraries of the device.
#pragma once

#include "platform/dynamic_loader.h"
#include "platform/linux/base/host.h"

namespace tbdaily {

// Opens a library only when it and every folder from the device root on belong to root or to the job's user
// and nobody else can write to them: what is loaded runs with the job's rights. What was judged is what is
// loaded.
class LinuxDynamicLoader : public DynamicLoader {
 public:
  explicit LinuxDynamicLoader(const Host& host) : host_(host) {}
  LibraryHandle open(std::string_view path) override;
  void* symbol(LibraryHandle library, const std::string& name) override;

 private:
  const Host& host_;
};

}  // namespace tbdaily

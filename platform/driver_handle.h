// A registry object that is released when its owner goes.
#pragma once

#include "platform/driver_registry.h"

namespace tbdaily {

class DriverHandle {
 public:
  DriverHandle(DriverRegistry& registry, KdHandle handle) : registry_(registry), handle_(handle) {}
  ~DriverHandle() {
    if (handle_ != 0) registry_.KdObjectRelease(handle_);
  }
  DriverHandle(const DriverHandle&) = delete;
  DriverHandle& operator=(const DriverHandle&) = delete;

  KdHandle get() const { return handle_; }

 private:
  DriverRegistry& registry_;
  KdHandle handle_;
};

}  // namespace tbdaily

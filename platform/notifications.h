// System-wide notifications by name, without payload.
//
// Absent service: posting does nothing.
#pragma once

#include <string_view>

namespace tbdaily {

class Notifications {
 public:
  virtual ~Notifications() = default;
  virtual void post(std::string_view name) = 0;
};

}  // namespace tbdaily

// Standard error while a screen has the terminal.
#pragma once

#include "platform/linux/base/file_io.h"

namespace tbdaily {

// As long as it lives, what is written to standard error is kept in memory; it is written at the end. Where
// that cannot be, standard error stays as it is.
class HeldErrors {
 public:
  HeldErrors();
  ~HeldErrors();
  HeldErrors(const HeldErrors&) = delete;
  HeldErrors& operator=(const HeldErrors&) = delete;

 private:
  FileDescriptor before_, held_;
};

}  // namespace tbdaily

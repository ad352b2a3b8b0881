// Diagnostics that keep what they are told.
#pragma once

#include <string>

#include "platform/diagnostics.h"

namespace tbdaily::testing {

struct FakeDiagnostics : Diagnostics {
  std::string errors, outputs;

 private:
  void writeError(std::string_view text) override { errors += text; }
  void writeOutput(std::string_view text) override { outputs += text; }
};

}  // namespace tbdaily::testing

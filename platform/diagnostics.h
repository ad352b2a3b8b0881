// What the storage modules say on standard error and standard output. Several messages have no line end of
// their own; they are written as they are.
#pragma once

#include <string_view>

namespace tbdaily {

class Diagnostics {
 public:
  virtual ~Diagnostics() = default;

  // Writes printf-formatted text to standard error.
  [[gnu::format(printf, 2, 3)]] void error(const char* format, ...);
  // The same for standard output.
  [[gnu::format(printf, 2, 3)]] void output(const char* format, ...);

 protected:
  virtual void writeError(std::string_view text) = 0;
  virtual void writeOutput(std::string_view text) = 0;
};

// The streams of the process.
Diagnostics& standardDiagnostics();

}  // namespace tbdaily

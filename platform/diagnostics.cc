#include "platform/diagnostics.h"

#include <algorithm>
#include <array>
#include <cstdarg>
#include <cstdio>

namespace tbdaily {

namespace {

class StandardDiagnostics : public Diagnostics {
  void writeError(std::string_view text) override { std::fwrite(text.data(), 1, text.size(), stderr); }
  void writeOutput(std::string_view text) override { std::fwrite(text.data(), 1, text.size(), stdout); }
};

// Longer than any message. No allocation: some messages tell that memory ran out.
using MessageBuffer = std::array<char, 1024>;

[[gnu::format(printf, 2, 0)]] std::string_view formatted(MessageBuffer& buffer, const char* format,
                                                         std::va_list arguments) {
  const int length = std::vsnprintf(buffer.data(), buffer.size(), format, arguments);
  return {buffer.data(), std::min(static_cast<std::size_t>(std::max(length, 0)), buffer.size() - 1)};
}

}  // namespace

void Diagnostics::error(const char* format, ...) {
  MessageBuffer buffer;
  std::va_list arguments;
  va_start(arguments, format);
  writeError(formatted(buffer, format, arguments));
  va_end(arguments);
}

void Diagnostics::output(const char* format, ...) {
  MessageBuffer buffer;
  std::va_list arguments;
  va_start(arguments, format);
  writeOutput(formatted(buffer, format, arguments));
  va_end(arguments);
}

Diagnostics& standardDiagnostics() {
  static StandardDiagnostics diagnostics;
  return diagnostics;
}

}  // namespace tbdaily

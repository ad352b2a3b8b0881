#include "drivermetrics/text_format.h"

#include <cstdarg>
#include <cstdio>

namespace kdreport {

std::string formatText(const char* format, ...) {
  std::va_list arguments, again;
  va_start(arguments, format);
  va_copy(again, arguments);
  const int length = std::vsnprintf(nullptr, 0, format, arguments);
  va_end(arguments);
  std::string text(length > 0 ? static_cast<std::size_t>(length) : 0, '\0');
  if (!text.empty()) std::vsnprintf(text.data(), text.size() + 1, format, again);
  va_end(again);
  return text;
}

std::string alternateHexadecimal(std::uint64_t value) {
  return formatText("%#llx", static_cast<unsigned long long>(value));
}

}  // namespace kdreport

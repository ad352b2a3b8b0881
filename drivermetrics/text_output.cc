// Text to a file descriptor, and the name of this process.

#include <unistd.h>

#include <cerrno>

#include "drivermetrics/kd_report.h"
#include "drivermetrics/text_format.h"
#include "platform/utf8.h"

namespace kdreport {

KdStatus KdReportWriteStringUTF8(int fd, KdReportText borrowed) {
  const auto text = borrowed.get();
  if (!text) return kKdBadArgument;
  if (!tbdaily::isUtf8(*text)) return kKdNoMemory;
  const ssize_t written = ::write(fd, text->data(), text->size());
  if (written < 0) return kKdIOError;
  return static_cast<std::size_t>(written) == text->size() ? kKdSuccess : kKdUnderrun;
}

std::string KdReportCopyCurrentProcessName() {
  return formatText("%s <pid %d>", program_invocation_short_name, static_cast<int>(::getpid()));
}

}  // namespace kdreport

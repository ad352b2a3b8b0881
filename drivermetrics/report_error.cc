#include "drivermetrics/report_error.h"

#include <array>
#include <cstdio>
#include <mutex>
#include <utility>

#include "drivermetrics/text_format.h"
#include "platform/utf8.h"

namespace kdreport {

namespace {
constexpr std::string_view kNoReason = "createPVErr() passed a NULL string!";

struct StatusText {
  KdStatus status;
  std::string_view text;
};
constexpr std::array<StatusText, 10> kStatusTexts = {{
    {kKdSuccess, "success"},
    {kKdError, "general failure"},
    {kKdNoMemory, "out of memory"},
    {kKdBadArgument, "bad argument"},
    {kKdInternalError, "bad legend"},
    {kKdIOError, "write failed"},
    {kKdUnsupportedMode, "unsupported format"},
    {kKdUnderrun, "short write"},
    {kKdAborted, "the registry changed"},
    {kKdNotFound, "not found"},
}};

// Where lines go, for the whole process.
struct Log {
  std::mutex mutex;
  KdReportLogSink sink;  // none: standard error
};
Log& processLog() {
  static Log log;
  return log;
}

void writeLine(const std::string& line) {
  Log& log = processLog();
  const std::lock_guard lock(log.mutex);
  if (log.sink) return log.sink(line);
  const std::string shown = tbdaily::withoutControls(line, tbdaily::TextPlace::Line) + '\n';
  std::fwrite(shown.data(), 1, shown.size(), stderr);
}
}  // namespace

ReportError createPVErr(KdStatus status, std::optional<std::string_view> reason) {
  return {std::string(kKernelStatusDomain), status, std::string(reason.value_or(kNoReason))};
}

bool KdReportErrorHasReason(const ReportError& error) {
  return error.reason != kNoReason;
}

std::string KdReportCopyStatusText(KdStatus status) {
  for (const StatusText& known : kStatusTexts) {
    if (known.status == status) return std::string(known.text);
  }
  return formatText("status 0x%08x", static_cast<unsigned>(status));
}

void KdReportSetLogSink(KdReportLogSink sink) {
  Log& log = processLog();
  const std::lock_guard lock(log.mutex);
  log.sink = std::move(sink);
}

void setError(KdReportErrorOut error, KdStatus status, std::optional<std::string_view> reason) {
  if (error != nullptr) *error = createPVErr(status, reason);
}

void kdrErrLog(KdStatus status, std::optional<std::string_view> functionName,
               const std::optional<ReportError>& error) {
  if (status >= 0) return;
  std::string line(functionName.value_or("<unknown> function"));
  line += ": ";
  if (!error) {
    line += "<unknown> error";
  } else if (!error->reason.empty()) {
    line += error->reason;
  } else {
    line += error->domain + " error " + std::to_string(error->code);
  }
  writeLine(line);
}

}  // namespace kdreport

#include "drivermetrics/report_error.h"

#include <iostream>

namespace tbdaily {

namespace {
constexpr std::string_view kNoReason = "createPVErr() passed a NULL string!";
}  // namespace

ReportError createPVErr(KdStatus status, std::optional<std::string_view> reason) {
  return {std::string(kKernelStatusDomain), status, std::string(reason.value_or(kNoReason))};
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
  std::cerr << line << '\n';
}

}  // namespace tbdaily

// The library's error objects and its line about failures.
#pragma once

#include "drivermetrics/kd_report.h"

namespace kdreport {

// The domain of every error: the code is a status of the kernel.
inline constexpr std::string_view kKernelStatusDomain = "KernelStatus";

// An error with the status as its code. Without a reason the text says that none was given.
ReportError createPVErr(KdStatus status, std::optional<std::string_view> reason);

// The error out-parameter filled, when the caller wants one; without a reason as for createPVErr.
void setError(KdReportErrorOut error, KdStatus status, std::optional<std::string_view> reason = std::nullopt);

// One line, on standard error or where the program wants it, about a status below zero: the function's name,
// when there is one, and why.
void kdrErrLog(KdStatus status, std::optional<std::string_view> functionName,
               const std::optional<ReportError>& error);

}  // namespace kdreport

// A subscription to channels, and how the companion says that the library failed.
#pragma once

#include <memory>
#include <optional>
#include <string_view>

#include "drivermetrics/kd_report.h"

namespace tbdaily {

class Tool;

// One line: what cannot be done, the library's reason and status, and what is missing where that is plain.
void failMetrics(Tool& tool, std::string_view what, const std::optional<kdreport::ReportError>& error);

// One subscription for as long as it lives. Borrows the tool.
class ChannelSampler {
 public:
  // Subscribes to all channels of the collection; a failure is said.
  ChannelSampler(Tool& tool, const kdreport::ChannelCollection& channels);
  explicit operator bool() const { return subscription_ != nullptr; }

  // The values of this moment; null when that failed, which is said.
  kdreport::KdReportCollection sample();

 private:
  Tool& tool_;
  kdreport::KdReportCollection subscribed_;
  std::shared_ptr<kdreport::KdReportSubscription> subscription_;
};

}  // namespace tbdaily

// Device and system information.
//
// Absent service: false, none, a failed query.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "platform/plist_value.h"

namespace tbdaily {

struct SystemGroupContainer {
  std::optional<std::string> path;  // absolute, as the device sees it
  std::uint64_t error = 0;          // meaningful when there is no path
};

class DeviceAnswers {
 public:
  virtual ~DeviceAnswers() = default;

  // False when the question has no boolean answer.
  virtual bool booleanAnswer(std::string_view question) = 0;
  virtual PlistValue copyAnswer(std::string_view question) = 0;
  // The "ProductBuildVersion" entry of the system version record.
  virtual std::optional<std::string> currentOSBuildVersion() = 0;
  // Nothing when the query fails.
  virtual std::optional<bool> multiUserMode() = 0;
  virtual SystemGroupContainer systemGroupContainerPath(std::string_view identifier) = 0;
};

}  // namespace tbdaily

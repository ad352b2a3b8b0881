// A step of a run is an island: what it throws ends that step and nothing else.
#pragma once

#include <exception>
#include <string_view>

#include "platform/platform.h"
#include "platform/system_log.h"

namespace tbdaily {

// Logs, at the error level, that the step of this name could not be finished. Where not even that can be
// done, nobody is told.
inline void logUnfinishedStep(Platform& platform, std::string_view name, const char* reason) noexcept {
  try {
    platform.systemLog.message(LogLevel::Error, "%{public}s could not be finished: %{public}s", name,
                               std::string_view(reason));
  } catch (const std::exception&) {
    return;
  }
}

template <typename Step>
void runStep(Platform& platform, std::string_view name, Step&& step) noexcept {
  try {
    step();
  } catch (const std::exception& failure) {
    logUnfinishedStep(platform, name, failure.what());
  }
}

}  // namespace tbdaily

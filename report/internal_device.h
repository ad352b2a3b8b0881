// Whether the device runs an internal build.
#pragma once

#include "platform/device_answers.h"
#include "platform/run_once.h"

namespace tbdaily {

// The answer of this process, asked for once and kept for its life. May be called from any thread.
bool TBIsInternalDevice(DeviceAnswers& answers);

// The process-wide value behind it; tests open `once` again to have it asked anew.
struct InternalDeviceAnswer {
  RunOnce once;
  bool isInternal = false;
};
extern InternalDeviceAnswer gInternalDeviceAnswer;

}  // namespace tbdaily

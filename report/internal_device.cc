#include "report/internal_device.h"

namespace tbdaily {

InternalDeviceAnswer gInternalDeviceAnswer;

bool TBIsInternalDevice(DeviceAnswers& answers) {
  gInternalDeviceAnswer.once.run(
      [&] { gInternalDeviceAnswer.isInternal = answers.booleanAnswer("InternalBuild"); });
  return gInternalDeviceAnswer.isInternal;
}

}  // namespace tbdaily

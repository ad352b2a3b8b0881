// Remote tasking and operating-system updates.
#pragma once

#include "platform/platform.h"

namespace tbdaily {

// Applies nothing yet: a scheduled tasking stays as it is.
void HandleTaskingAndOSChange(Platform& platform);

}  // namespace tbdaily

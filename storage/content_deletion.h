// Whether the storage controller recommends that content be deleted, for example because the flash wears out.
#pragma once

#include "platform/diagnostics.h"
#include "platform/driver_registry.h"
#include "storage/exporters.h"

namespace tbdaily {

// False too when there is no controller, when it has no such query (nothing is said then) and when it does
// not answer; troubles are told on standard error.
bool NandRecommendsContentDeletion(DriverRegistry& registry, Diagnostics& diagnostics);

}  // namespace tbdaily

// Whether a tasking is well-formed.
#pragma once

#include "platform/plist_value.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

// Fails for a tasking that the job would ignore, whole or in part.
Outcome<Nothing> checkTasking(const PlistValue& tasking);

}  // namespace tbdaily

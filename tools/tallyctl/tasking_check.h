// Whether a tasking is well-formed.
#pragma once

#include <string>

#include "platform/plist_value.h"

namespace tbdaily {

// Why the job would ignore the tasking or a part of it, in one line; empty when it is well-formed.
std::string taskingFault(const PlistValue& tasking);

}  // namespace tbdaily

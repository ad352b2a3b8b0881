// What the host's os-release file says about the operating system.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/linux/base/host.h"

namespace tbdaily {

// The value of a variable (for example VERSION_ID), unquoted; nothing when there is no such file or variable,
// or it is empty.
std::optional<std::string> osReleaseValue(const Host& host, std::string_view variable);

}  // namespace tbdaily

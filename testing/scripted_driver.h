// A driver as a test describes it, to a fake registry or in a recording.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "platform/plist_value.h"

namespace tbdaily::testing {

struct ScriptedDriver {
  std::optional<std::uint64_t> identifier;  // without one, or without a name, that query fails
  std::optional<std::string> name;
  std::string serviceClass;
  PlistDictionary properties;
  std::optional<std::uint64_t> parent;  // the identifier of another driver
  std::uint32_t retainCount = 1;
};

}  // namespace tbdaily::testing

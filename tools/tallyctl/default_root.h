// The device root of an installed job.
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

namespace tbdaily {

// The file that the service's units read too.
inline constexpr std::string_view kDefaultsFile = "/etc/default/tbdaily";

// What the text of such a file says of a name: lines NAME=VALUE, of which the last one holds, `#` comments, a
// value in single or double quotes or without; as the service manager reads it. Nothing when no line has it,
// or an empty value.
std::optional<std::string> valueFromDefaults(std::string_view text, std::string_view name);

// TBDAILY_ROOT of the file; nothing when there is none. Throws std::runtime_error when the file is there and
// cannot be read: another root would be looked at in its place.
std::optional<std::string> rootFromDefaults(const std::filesystem::path& file);

}  // namespace tbdaily

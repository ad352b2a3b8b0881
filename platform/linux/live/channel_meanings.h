// What the channels of the live drivers mean.
#pragma once

#include <optional>
#include <string_view>

namespace tbdaily {

// One sentence about the channel of that name; nothing about names that no live driver gives.
std::optional<std::string_view> channelMeaning(std::string_view name);

}  // namespace tbdaily

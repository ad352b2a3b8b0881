// Keys that words of the command line select.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace tbdaily {

// Whether the key has one of the words in it, whatever the case of ASCII letters; without words every key is
// meant.
bool isSelected(std::string_view key, const std::vector<std::string>& words);

// Whether the texts are equal but for the case of ASCII letters.
bool equalsIgnoringCase(std::string_view a, std::string_view b);

}  // namespace tbdaily

// Property lists out of a fuzzer's input.
#pragma once

#include <span>
#include <string_view>

#include "fuzz/input.h"
#include "platform/plist_value.h"

namespace tbdaily::fuzz {

// All of the input when it is a property list in XML or binary form; else a value that its bytes describe,
// whose keys and texts are mostly of these words.
PlistValue plistOf(Input& input, std::span<const std::string_view> words);
// The same from a section of the input.
PlistValue plistOfSection(Input& input, std::span<const std::string_view> words);

}  // namespace tbdaily::fuzz

// Sizes of files as people write and read them.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace tbdaily {

// "64M": a decimal number, with K, M or G for powers of 1024 behind it. Nothing for another text, or one that
// does not fit.
std::optional<std::uint64_t> parseSize(std::string_view text);

// "812 bytes", "12.3 KiB", "1.50 GiB".
std::string sizeText(std::uint64_t bytes);

}  // namespace tbdaily

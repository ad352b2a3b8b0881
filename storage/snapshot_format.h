// The print formats in a snapshot header. They come from the controller, so they are read here and never
// reach printf.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

#include "storage/snapshot_text.h"

namespace tbdaily {

inline constexpr std::size_t kSnapshotFormatSize = 16;

// Appends the format with its conversions replaced, as printf does. A format may use fewer conversions than
// there are arguments. One that has no NUL in its kSnapshotFormatSize characters, or that asks for anything
// but a conversion of the arguments (d, i, u, o, x, X for values; s for a text) with C's flags and a width
// and a precision of at most SnapshotText::kWidest, is appended as it stands, up to its NUL.
void appendFormatted(SnapshotText& out, std::span<const char, kSnapshotFormatSize> format,
                     std::span<const std::uint32_t> values);
void appendFormatted(SnapshotText& out, std::span<const char, kSnapshotFormatSize> format,
                     std::string_view argument);

}  // namespace tbdaily

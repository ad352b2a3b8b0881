// The limits that hold for property lists in every encoding.
#pragma once

namespace tbdaily {

// How many arrays and dictionaries may lie inside each other.
inline constexpr int kPlistNestingLimit = 512;

inline constexpr const char* kPlistNestingError = "more than 512 arrays and dictionaries inside each other";

}  // namespace tbdaily

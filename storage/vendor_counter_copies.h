// Where the words of a counter block go in the common record, one table for each layout. Some runs cross the
// bounds of the record's named arrays, and the order is not everywhere that of the block: so it is laid out
// by the controllers.
#pragma once

#include <array>
#include <cstdint>

namespace tbdaily {

struct CounterCopy {
  std::uint16_t to = 0;    // first word of the record
  std::uint16_t from = 0;  // first word of the block
  std::uint16_t count = 1;
};

// clang-format off

inline constexpr std::array<CounterCopy, 22> k1yCopies = {{
    {0, 256, 8},
    {8, 265},
    {9, 267, 10},
    {19, 303},
    {20, 390, 2},
    {22, 372},
    {33, 278, 8},
    {41, 277},
    {42, 290},
    {43, 371},
    {44, 393},
    {45, 392},
    {56, 292, 8},
    {65, 21},
    {66, 305, 2},
    {68, 313, 5},
    {73, 370},
    {74, 15},
    {75, 531, 2},
    {103, 318, 20},
    {125, 338, 20},
    {145, 373, 12},
}};

inline constexpr std::array<CounterCopy, 13> k1xSandiskCopies = {{
    {0, 256, 6},
    {8, 265},
    {9, 267, 7},
    {17, 275, 2},
    {19, 301},
    {33, 278, 6},
    {41, 277},
    {42, 288},
    {56, 290, 8},
    {65, 16},
    {66, 303, 2},
    {68, 311, 5},
    {74, 10},
}};

inline constexpr std::array<CounterCopy, 13> k1xHynixCopies = {{
    {0, 256, 4},
    {8, 263},
    {9, 265, 7},
    {17, 273, 2},
    {19, 297},
    {33, 276, 4},
    {41, 275},
    {42, 284},
    {56, 286, 8},
    {65, 16},
    {66, 299, 2},
    {68, 307, 5},
    {74, 10},
}};

inline constexpr std::array<CounterCopy, 20> kAlgoGenericCopies = {{
    {0, 0, 19},
    {19, 37},
    {20, 117, 2},
    {22, 91},
    {33, 20, 8},
    {41, 19},
    {42, 116},
    {43, 90},
    {44, 120},
    {45, 119},
    {56, 28, 8},
    {65, 104},
    {66, 38, 7},
    {73, 89},
    {74, 105},
    {75, 114, 2},
    {103, 45, 20},
    {125, 67, 20},
    {145, 92, 12},
    {157, 106, 8},
}};

inline constexpr std::array<CounterCopy, 36> kAlgoGenericQ8Copies = {{
    {0, 0, 8},
    {9, 9, 10},
    {19, 27},
    {20, 105, 2},
    {22, 79},
    {25, 115, 4},
    {29, 8},
    {30, 120, 2},
    {32, 110},
    {41, 19},
    {42, 104},
    {43, 78},
    {44, 108},
    {45, 107},
    {46, 122},
    {56, 20, 3},
    {60, 23, 3},
    {65, 92},
    {66, 28, 2},
    {74, 93},
    {75, 102, 2},
    {78, 30, 3},
    {81, 77},
    {82, 112, 3},
    {85, 126},
    {86, 123},
    {87, 94, 5},
    {93, 99, 3},
    {96, 109},
    {97, 111},
    {98, 45, 4},
    {102, 26},
    {103, 33, 12},
    {125, 55, 20},
    {145, 80, 12},
    {167, 75, 2},
}};
// clang-format on

}  // namespace tbdaily

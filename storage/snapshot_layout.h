// What a line of a snapshot shows: the legend, and the fixed layout's records word by word.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

#include "storage/short_text.h"

namespace tbdaily {

// The C row lacks its line end: readers of the text know it so.
inline constexpr std::string_view kSnapshotLegend =
    "Key: \n"
    "T   - Timestamp\n"
    "E   - Erased bands during this time interval\n"
    "HR  - Host Reads (in 4k sectors)\n"
    "HW  - Host Writes (in 4k sectors)\n"
    "NR  - Nand Reads (in 4k sectors)\n"
    "NW  - Nand Writes (in 4k sectors)\n"
    "TH  - Time in Hysteresis in this time interval (in ms)\n"
    "GC  - Number of sectors (4k bytes) completed GC in this time interval\n"
    "W   - Number of wear level bands completed in this time interval\n"
    "BI  - Bands Intermediate (SLC) PendingErase\n"
    "BU  - Bands User (MLC) PendingErase\n"
    "V   - Number of Free Nodes\n"
    "BF  - Buffer Fragments/BufferHighWater\n"
    "P   - Percent of time in DoPreempt rather than DoNormal\n"
    "H   - Qos Delays: Normal/Extreme\n"
    "X   - Successful expedite commands/Failed expedite commands\n"
    "L   - Age of the oldest command in ms (calculated every second)/Qos Interval (in 100us units)\n"
    "C   - Command tags in use by host (Min/Max)"
    "S   - Number of free segs\n"
    "U   - Sectors of host unmaps\n"
    "RO  - Num read ops for this time interval: priority0/priority1/...\n"
    "RL  - Total Read Latency (in us) for this time interval: priority0/priority1/...\n"
    "RM  - Max Read Latency (int us) for this time interval: priority0/priority1/...\n"
    "WO  - Num write ops for this time interval: priority0/priority1/...\n"
    "WL  - Total write latency (in us) for this time interval: priority0/priority1/...\n"
    "WM  - Max write latency (in us) for this time interval: priority0/priority1/...\n"
    "\n";
static_assert(kSnapshotLegend.size() == 1337);

inline constexpr std::size_t kSnapshotRecordSize = 252;

// One number of the line: its label, the word of the record, and the width to which it is filled up.
struct SnapshotColumn {
  ShortText label;
  std::uint8_t word = 0;
  std::uint8_t width = 0;
  char fill = ' ';
};

// In the order of the line, up to the hysteresis time.
inline constexpr std::array<SnapshotColumn, 6> kSnapshotColumnsBeforeHysteresis = {{
    {"T=", 0, 4, '0'},
    {" E=", 26, 2, '0'},
    {" HR=", 27, 4},
    {" HW=", 28, 4},
    {" NR=", 29, 4},
    {" NW=", 30, 4},
}};

// In microseconds, shown in milliseconds with two decimals. The width is that of the whole part.
inline constexpr SnapshotColumn kSnapshotHysteresisColumn = {" TH=", 39, 8};

inline constexpr std::array<SnapshotColumn, 18> kSnapshotColumnsAfterHysteresis = {{
    {" GC=", 31, 4},
    {" W=", 33, 2},
    {" BI=", 36, 3},
    {" BU=", 37, 3},
    {" V=", 45, 5},
    {" BF=", 47, 2},
    {"/", 48, 2},
    {" P=", 1, 2},
    {" H=", 41, 2},  // the normal delays, which the record holds after the extreme ones
    {"/", 40, 2},
    {" X=", 50, 2},
    {"/", 51, 2},
    {" L=", 43, 3},
    {"/", 44, 3},
    {" C=", 53, 2},
    {"/", 54, 2},
    {" S=", 42, 4},
    {" U=", 52, 8},
}};

// Operations, total latency and maximum latency (both in microseconds) of one priority.
inline constexpr std::size_t kPriorityTripleWords = 3;
inline constexpr std::size_t kSnapshotPriorities = 4;
inline constexpr ShortText kPriorityDelimiter = "/";

// One value of every priority, slashes between them. The word is that of priority 0.
inline constexpr std::array<SnapshotColumn, 6> kSnapshotPriorityColumns = {{
    {" RO=", 14, 4},
    {" RL=", 15, 7},
    {" RM=", 16, 5},
    {" WO=", 2, 4},
    {" WL=", 3, 7},
    {" WM=", 4, 5},
}};

// The same values where a header describes them: the letter that completes the header's label, and the word
// within a triple.
inline constexpr std::array<SnapshotColumn, kPriorityTripleWords> kDescribedPriorityColumns = {{
    {"O", 0, 4},
    {"L", 1, 7},
    {"M", 2, 5},
}};

}  // namespace tbdaily

// How much the kernel thread that freezes virtual memory has written to the storage, from a stack snapshot.
#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string_view>

#include "platform/platform.h"
#include "platform/plist_value.h"

namespace tbdaily {

inline constexpr std::string_view kNANDInfoVMFreezerNumPhysicalWritesKey =
    "com.velmora.NANDInfo.VMFreezer.NumPhysicalWrites";
inline constexpr std::string_view kNANDInfoVMFreezerErrorKey = "com.velmora.NANDInfo.VMFreezer.Error";
inline constexpr std::string_view kNANDInfoVMFreezerErrorMessageKey =
    "com.velmora.NANDInfo.VMFreezer.ErrorMessage";

// Takes a snapshot. Either the one entry kNANDInfoVMFreezerNumPhysicalWritesKey (64-bit, in the kernel's own
// unit; 0 when the thread has no statistics) or, when there is no snapshot or no such thread in it, the two
// error entries (strings). Says nothing.
PlistDictionary CopyVMFreezerNANDInfo(Platform& platform);

// Borrowed from the buffer that was searched; none when the thread has none.
using KcdataIOStats = std::optional<std::span<const std::byte>>;

// Searches the first container of a kcdata buffer and those nested in it for one that directly holds the
// thread name; writes that container's I/O statistics, as they lie in the buffer, and answers true. A
// container that is not closed reaches to the end of the buffer; an item that does not fit ends the search.
// `cursor`, which may be null, receives the offset of the item where the walk stopped. A name without data is
// missing and is not found.
bool getIOStatsWithThreadnameFromKCDataHelper(std::span<const std::byte> buffer, std::string_view threadName,
                                              KcdataIOStats& ioStats, std::size_t* cursor);
// The same without a cursor.
bool getIOStatsWithThreadnameFromKCData(std::span<const std::byte> buffer, std::string_view threadName,
                                        KcdataIOStats& ioStats);

}  // namespace tbdaily

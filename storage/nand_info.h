// The storage controller's health as a flat dictionary of numbers under "com.velmora.NANDInfo." keys.
#pragma once

#include <array>
#include <optional>
#include <string_view>

#include "platform/diagnostics.h"
#include "platform/platform.h"
#include "platform/plist_value.h"
#include "storage/stats_context.h"

namespace tbdaily {

inline constexpr std::string_view kNANDInfoErrorKey = "com.velmora.NANDInfo.Error";
inline constexpr std::string_view kNANDInfoErrorMessageKey = "com.velmora.NANDInfo.ErrorMessage";
// Despite its text it holds weeks.
inline constexpr std::string_view kNANDInfoFormatWeeksSince2000Key =
    "com.velmora.NANDInfo.formatDaysSince2000";
inline constexpr std::array<std::string_view, 5> kNANDInfoReadsBeforeErasureKeys = {
    "com.velmora.NANDInfo.ReadsBeforeErasure0",      "com.velmora.NANDInfo.ReadsBeforeErasure50000",
    "com.velmora.NANDInfo.ReadsBeforeErasure100000", "com.velmora.NANDInfo.ReadsBeforeErasure150000",
    "com.velmora.NANDInfo.ReadsBeforeErasure200000",
};

// Fetches the controller afresh. When that fails, two entries only: kNANDInfoErrorKey (the string "1") and
// kNANDInfoErrorMessageKey.
PlistDictionary CopyNANDInfo(Platform& platform);

// The dictionary of a parsed buffer. The log variant has no version and demo-mode entries, and is none for a
// context without an export version, which otherwise gives the two error entries. Unsigned values are stored
// in signed numbers of the same width.
std::optional<PlistDictionary> NandInfoFromContext(PreferencesStore& preferences, const StatsContext& context,
                                                   bool logVariant, Diagnostics& diagnostics);

// Fetches the controller and merges the log variant into the target; nothing when the fetch fails.
void DumpNANDInfo(Platform& platform, PlistDictionary& target);

// Sets one entry of a dictionary; for each entry of another.
void CopyDictionary(std::string_view key, const PlistValue& value, PlistDictionary& target);

// Sets the key to a number of the kind that it was made with. Says "Failed to create PVNumber from value: %p"
// (without a line end) and sets nothing when there is no memory for it.
void SetNumberValue(PlistDictionary& dictionary, std::string_view key, const PlistNumber& value,
                    Diagnostics& diagnostics);

}  // namespace tbdaily

// What the figures of the NAND info dictionary mean, for people.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace tbdaily {

// How a figure is shown beside its raw value.
enum class NandUnit { Count, Sectors, Bytes, MiB, Milliseconds, Weeks, Percent, Code };

struct NandGlossaryRow {
  std::string_view base;   // of the key, behind "com.velmora.NANDInfo.", without the number at its end
  std::string_view group;  // the subject under which it is shown
  NandUnit unit;
  std::string_view sentence;
};

// The row for a key, with or without "com.velmora.NANDInfo." in front; nothing for a key that the dictionary
// cannot hold.
const NandGlossaryRow* findNandGlossary(std::string_view key);

// What findNandGlossary knows, without the numbers at their ends.
std::vector<std::string> nandGlossaryKeys();
// The subjects, each once, in their order.
std::vector<std::string_view> nandGlossaryGroups();
// The rows of a subject; none for another text. Whatever the case of its letters.
std::vector<const NandGlossaryRow*> nandGlossaryGroup(std::string_view name);

// The key without "com.velmora.NANDInfo.".
std::string_view withoutNandPrefix(std::string_view key);
// The number of a figure within its row's series; none where it stands alone.
std::optional<std::size_t> nandSeriesNumber(const NandGlossaryRow& row, std::string_view key);
// Whether the figures of the row are the ranges of one histogram.
bool isNandHistogram(const NandGlossaryRow& row);

// One sentence, with the place in the series where the key is one of several.
std::optional<std::string> explainNandKey(std::string_view key);

// A figure for people in its unit ("8.0 TiB"); empty where the raw count says it all.
std::string humanNandFigure(NandUnit unit, std::int64_t value);

}  // namespace tbdaily

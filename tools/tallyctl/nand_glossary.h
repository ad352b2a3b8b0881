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

// One sentence, with the place in the series where the key is one of several.
std::optional<std::string> explainNandKey(std::string_view key);

// A figure for people in its unit ("8.0 TiB"); empty where the raw count says it all.
std::string humanNandFigure(NandUnit unit, std::int64_t value);

}  // namespace tbdaily

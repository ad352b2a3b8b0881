// Numbers that the host shows in files, and the files that they are read from again and again.
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/linux/base/file_io.h"

namespace tbdaily {

// Where the number of a source stands among all that were found.
using Slot = std::size_t;
// By slot: what was read last.
using Readings = std::vector<std::int64_t>;

// What a number may be. A counter is not negative; the most negative number stands for "invalid" elsewhere
// and is never read.
enum class NumberRange : std::uint8_t { Counter, Signed };

// A decimal number of the range; nothing for any other text. White space around it is none of it.
std::optional<std::int64_t> liveNumber(std::string_view text, NumberRange range);

// One opened source of several numbers, for one subscription.
class LiveSource {
 public:
  virtual ~LiveSource() = default;
  // Takes the numbers of this moment; what cannot be read keeps its last value. Allocates nothing.
  virtual void read(Readings& readings) = 0;
};

// A number in a text: in the line that begins with a word (the first line, where the word is empty), the word
// of that number behind it.
struct TextCell {
  std::string line = {};
  std::size_t word = 0;
  std::string_view label = {};  // "total=": what the number follows, in place of counting words
  NumberRange range = NumberRange::Counter;
  bool isAlone = false;  // the text holds nothing else
  Slot slot = 0;
};

// The numbers of the cells that can be read from the text, into their slots. Cells of one line stand
// together.
void readCells(std::string_view text, const std::vector<TextCell>& cells, Readings& readings);
// The number of one cell.
std::optional<std::int64_t> cellNumber(std::string_view text, const TextCell& cell);

// A file of /proc or /sys, opened once where the limit on open files allows it.
std::unique_ptr<LiveSource> openTextSource(const std::filesystem::path& file, std::vector<TextCell> cells);

// All of a host's file; nothing where it cannot be read.
std::optional<std::string> liveText(const std::filesystem::path& file);

}  // namespace tbdaily

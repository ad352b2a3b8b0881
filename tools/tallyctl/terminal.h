// Where the companion prints: plain and stable when piped; colour, drawing characters and progress only on a
// terminal that can show them.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "tools/tallyctl/pager.h"

namespace tbdaily {

enum class Style { Plain, Heading, Dim, Good, Bad };

// What may be written to a terminal. Any text becomes one when it is printed, and what could drive the
// terminal becomes escapes then; colours and the like come from Terminal alone.
class ShownText {
 public:
  ShownText() = default;
  ShownText(std::string_view text);  // on one line
  ShownText(const std::string& text) : ShownText(std::string_view(text)) {}
  ShownText(const char* text) : ShownText(std::string_view(text)) {}
  // Keeps the line feeds and tabs of a text that has lines of its own.
  static ShownText lines(std::string_view text);

  const std::string& bytes() const { return bytes_; }
  std::size_t columns() const;  // of a text without colours, one for each character
  ShownText withoutTrailingSpaces() const;

  friend ShownText operator+(ShownText left, const ShownText& right) {
    left.bytes_ += right.bytes_;
    return left;
  }
  ShownText& operator+=(const ShownText& right) { return *this = std::move(*this) + right; }

 private:
  friend class Terminal;
  std::string bytes_;
};

class Terminal {
 public:
  Terminal();  // looks at standard output, NO_COLOR, TERM and the locale variables

  // Text that is longer than the screen goes to a pager from now on, where standard output is a terminal.
  void usePager();
  // Shows what is kept back, and waits for the pager. Whether all was written.
  bool finish();

  void print(const ShownText& text);
  void line(const ShownText& text = {});
  // The text with the style's colour, or as it is.
  ShownText styled(const ShownText& text, Style style) const;

  // A bar of `value` out of `maximum` in at most `width` columns: block characters where they can be shown,
  // else '#'. A value that is not 0 shows at least one mark.
  std::string bar(double value, double maximum, std::size_t width) const;

  // One column for each value between the two bounds; a space where there is none. Eighths of blocks where
  // they can be shown, else characters that grow darker.
  std::string sparkline(const std::vector<std::optional<double>>& values, double lowest,
                        double highest) const;

  std::size_t width() const { return width_; }
  // Columns that a line may take; 0 where it may be as long as it is, since it goes to no screen.
  std::size_t lineWidth() const { return isScreen_ ? width_ : 0; }

 private:
  void write(std::string_view bytes);

  bool isScreen_ = false;
  bool colour_ = false;
  bool drawing_ = false;
  std::size_t width_ = 80;
  std::size_t height_ = 0;  // lines that may be kept back until it is known whether all fits; 0: none
  std::size_t lines_ = 0;   // of what is kept back
  std::string keptBack_;
  Pager pager_;
};

// One line on standard error, behind the program's name.
void printError(const ShownText& reason);

// A number in at most six significant digits, and one with so many digits behind the point, for people.
std::string sixDigits(double value);
std::string withDigits(double value, int behindThePoint);

// Rows of cells under each other; numbers to the right. On a screen that is too narrow for all of it, text in
// the last column goes on in the next line, and a first cell that is too long has a line of its own above its
// row.
class Table {
 public:
  enum class Align { Left, Right };
  explicit Table(std::vector<Align> columns) : columns_(std::move(columns)) {}
  void add(std::vector<ShownText> cells) { rows_.push_back(std::move(cells)); }
  // Each row indented by two columns, cells two apart: a line for each row, however long.
  std::vector<ShownText> lines() const;
  void print(Terminal& out) const;
  // The same, and after each row what the function prints.
  void print(Terminal& out, const std::function<void(std::size_t row)>& after) const;

 private:
  static constexpr std::size_t kIndent = 2, kBetween = 2;

  std::vector<std::size_t> widthsWithin(std::size_t width) const;
  // The lines of each row, none longer than the width (0: any) where that is possible.
  std::vector<std::vector<ShownText>> linesWithin(std::size_t width) const;

  std::vector<Align> columns_;
  std::vector<std::vector<ShownText>> rows_;
};

// Rows of a label, a count and a bar of it; the longest bar takes what the screen leaves.
struct BarRow {
  ShownText label;
  std::int64_t count = 0;
};
void printBars(Terminal& out, const std::vector<BarRow>& rows);

// A progress bar on standard error, when that is a terminal, for work that takes more than a second. Cleared
// at the end.
class Progress {
 public:
  // What is counted; of bytes the rate is shown, and how long the rest takes at it.
  enum class Of : std::uint8_t { Bytes, Time };
  // `total` may be 0 when it is not known.
  Progress(std::string label, Of what, std::uint64_t total);
  ~Progress();
  Progress(const Progress&) = delete;
  Progress& operator=(const Progress&) = delete;
  void at(std::uint64_t done);

 private:
  const std::string label_;
  const Of what_;
  const std::uint64_t total_;
  const bool shown_;
  bool drawn_ = false;
  const std::chrono::steady_clock::time_point begin_;
  std::chrono::steady_clock::time_point nextDraw_;
};

}  // namespace tbdaily

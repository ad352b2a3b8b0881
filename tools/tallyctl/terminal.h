// Where the companion prints: plain and stable when piped; colour, drawing characters and progress only on a
// terminal that can show them.
#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace tbdaily {

enum class Style { Plain, Heading, Dim, Good, Bad };

class Terminal {
 public:
  Terminal();  // looks at standard output, NO_COLOR, TERM and the locale variables

  void print(std::string_view text);
  void line(std::string_view text = {});
  // The text with the style's colour, or as it is.
  std::string styled(std::string_view text, Style style) const;

  // A bar of `value` out of `maximum` in at most `width` columns: block characters where they can be shown,
  // else '#'. A value that is not 0 shows at least one mark.
  std::string bar(double value, double maximum, std::size_t width) const;

  std::size_t width() const { return width_; }

 private:
  bool colour_ = false;
  bool drawing_ = false;
  std::size_t width_ = 80;
};

// Text with control characters, which could drive a terminal, replaced by '?'.
std::string printable(std::string_view text);

// A number in at most six significant digits, for people.
std::string sixDigits(double value);

// How many columns UTF-8 text takes, one for each character.
std::size_t columnsOf(std::string_view text);

// Rows of cells under each other; numbers to the right.
class Table {
 public:
  enum class Align { Left, Right };
  explicit Table(std::vector<Align> columns) : columns_(std::move(columns)) {}
  void add(std::vector<std::string> cells) { rows_.push_back(std::move(cells)); }
  // Each row indented by two columns, cells two apart.
  void print(Terminal& out) const;

 private:
  std::vector<Align> columns_;
  std::vector<std::vector<std::string>> rows_;
};

// A progress bar on standard error, when that is a terminal, for work that takes more than a second. Cleared
// at the end.
class Progress {
 public:
  // `total` may be 0 when it is not known.
  Progress(std::string label, std::uint64_t total);
  ~Progress();
  Progress(const Progress&) = delete;
  Progress& operator=(const Progress&) = delete;
  void at(std::uint64_t done);

 private:
  const std::string label_;
  const std::uint64_t total_;
  const bool shown_;
  bool drawn_ = false;
  std::chrono::steady_clock::time_point nextDraw_;
};

}  // namespace tbdaily

#include "tools/tallyctl/terminal.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <clocale>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cwchar>
#include <utility>

#include "platform/utf8.h"
#include "tools/tallyctl/sizes.h"

namespace tbdaily {

namespace {

std::string_view environment(const char* variable) {
  const char* text = std::getenv(variable);
  return text != nullptr ? text : "";
}

bool localeIsUtf8() {
  for (const char* variable : {"LC_ALL", "LC_CTYPE", "LANG"}) {
    const std::string_view locale = environment(variable);
    if (locale.empty()) continue;
    return locale.find("UTF-8") != std::string_view::npos || locale.find("utf8") != std::string_view::npos;
  }
  return false;
}

std::string repeated(std::string_view text, std::size_t count) {
  std::string result;
  for (std::size_t i = 0; i < count; ++i) result += text;
  return result;
}

constexpr auto kFirstDraw = std::chrono::seconds(1);
constexpr auto kRedraw = std::chrono::milliseconds(100);

}  // namespace

Terminal::Terminal() {
  // How wide characters are; texts are UTF-8 wherever they are shown.
  if (std::setlocale(LC_CTYPE, "C.UTF-8") == nullptr) std::setlocale(LC_CTYPE, "");
  if (::isatty(STDOUT_FILENO) == 0) return;
  isScreen_ = true;
  const bool capable = environment("TERM") != "dumb" && !environment("TERM").empty();
  colour_ = capable && environment("NO_COLOR").empty();
  drawing_ = capable && localeIsUtf8();
  winsize size{};
  if (::ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col >= 40) width_ = size.ws_col;
}

ShownText::ShownText(std::string_view text) : bytes_(withoutControls(text, TextPlace::Line)) {}

ShownText ShownText::lines(std::string_view text) {
  ShownText shown;
  shown.bytes_ = withoutControls(text, TextPlace::Lines);
  return shown;
}

std::size_t ShownText::columns() const {
  std::size_t columns = 0;
  std::string_view rest = bytes_;
  std::mbstate_t state{};
  while (!rest.empty()) {
    // What the locale does not have takes a column a character.
    wchar_t character = 0;
    std::size_t length = static_cast<unsigned char>(rest[0]) < 0x80
                             ? 1
                             : std::mbrtowc(&character, rest.data(), rest.size(), &state);
    const bool isKnown = length != 0 && length <= rest.size();
    const int width = isKnown && character != 0 ? ::wcwidth(character) : 1;
    if (!isKnown) {
      state = {};
      length = 1;
      while (length < rest.size() && continuesCharacter(rest[length])) ++length;
    }
    columns += width > 0 ? static_cast<std::size_t>(width) : 0;
    rest.remove_prefix(length);
  }
  return columns;
}

ShownText ShownText::withoutTrailingSpaces() const {
  ShownText shown = *this;
  shown.bytes_.erase(shown.bytes_.find_last_not_of(' ') + 1);
  return shown;
}

void Terminal::usePager() {
  winsize size{};
  const std::string_view type = environment("TERM");
  if (::isatty(STDOUT_FILENO) == 0 || ::isatty(STDIN_FILENO) == 0 || type.empty() || type == "dumb" ||
      !Pager::isWanted())
    return;
  if (::ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_row > 1) height_ = size.ws_row - 1U;
}

void Terminal::write(std::string_view bytes) {
  if (pager_.isRunning()) return pager_.write(bytes);
  if (height_ == 0) {
    if (!bytes.empty()) std::fwrite(bytes.data(), 1, bytes.size(), stdout);
    return;
  }
  keptBack_ += bytes;
  lines_ += static_cast<std::size_t>(std::ranges::count(bytes, '\n'));
  if (lines_ <= height_) return;
  height_ = 0;
  pager_.start();
  write(std::exchange(keptBack_, {}));
}

bool Terminal::finish() {
  height_ = 0;
  write(std::exchange(keptBack_, {}));
  pager_.finish();
  return std::fflush(stdout) == 0;
}

void Terminal::print(const ShownText& text) {
  write(text.bytes());
}

void Terminal::line(const ShownText& text) {
  write(text.bytes());
  write("\n");
}

ShownText Terminal::styled(const ShownText& text, Style style) const {
  static constexpr std::array<std::string_view, 5> kCodes = {"", "\x1b[1m", "\x1b[2m", "\x1b[32m",
                                                             "\x1b[31m"};
  if (!colour_ || style == Style::Plain) return text;
  ShownText styled;
  styled.bytes_.append(kCodes[static_cast<std::size_t>(style)]).append(text.bytes()).append("\x1b[0m");
  return styled;
}

std::string Terminal::bar(double value, double maximum, std::size_t width) const {
  if (!(value > 0) || !(maximum > 0)) return {};
  const double share = std::min(value / maximum, 1.0) * static_cast<double>(width);
  if (!drawing_)
    return std::string(std::max<std::size_t>(static_cast<std::size_t>(std::lround(share)), 1), '#');
  static constexpr std::array<std::string_view, 8> kEighths = {"", "▏", "▎", "▍", "▌", "▋", "▊", "▉"};
  const auto eighths = std::max<std::size_t>(static_cast<std::size_t>(std::lround(share * 8)), 1);
  return repeated("█", eighths / 8).append(kEighths[eighths % 8]);
}

std::string Terminal::sparkline(const std::vector<std::optional<double>>& values, double lowest,
                                double highest) const {
  static constexpr std::array<std::string_view, 8> kBlocks = {"▁", "▂", "▃", "▄", "▅", "▆", "▇", "█"};
  static constexpr std::array<std::string_view, 8> kPlain = {".", ":", "-", "=", "+", "*", "#", "@"};
  const auto& marks = drawing_ ? kBlocks : kPlain;
  std::string line;
  for (const std::optional<double>& value : values) {
    if (!value || !std::isfinite(*value)) {
      line += ' ';
      continue;
    }
    const double share = highest > lowest ? (*value - lowest) / (highest - lowest) : 0;
    line += marks[static_cast<std::size_t>(std::lround(std::clamp(share, 0.0, 1.0) * 7))];
  }
  return line;
}

void printError(const ShownText& reason) {
  std::fprintf(stderr, "tallyctl: %s\n", reason.bytes().c_str());
}

std::string sixDigits(double value) {
  std::array<char, 32> buffer;
  const int length = std::snprintf(buffer.data(), buffer.size(), "%.6g", value);
  return {buffer.data(), static_cast<std::size_t>(length)};
}

std::string withDigits(double value, int behindThePoint) {
  std::array<char, 400> buffer;  // the longest has 309 digits before the point
  const int length = std::snprintf(buffer.data(), buffer.size(), "%.*f", behindThePoint, value);
  return {buffer.data(), static_cast<std::size_t>(length)};
}

namespace {

// The text at its spaces in lines of so many columns; a word that is longer stays whole.
std::vector<ShownText> atSpaces(const ShownText& text, std::size_t columns) {
  std::vector<ShownText> lines;
  std::string_view rest = text.bytes();
  std::string line;
  while (!rest.empty()) {
    const std::string_view word = rest.substr(0, rest.find(' '));
    rest.remove_prefix(std::min(rest.size(), word.size() + 1));
    std::string longer = line.empty() ? std::string(word) : line + " " + std::string(word);
    if (!line.empty() && ShownText(longer).columns() > columns) {
      lines.emplace_back(line);
      longer = word;
    }
    line = std::move(longer);
  }
  lines.emplace_back(line);
  return lines;
}

}  // namespace

// How wide the columns are on the screen: what is too long stands in the first column, or in a last one of
// text.
std::vector<std::size_t> Table::widthsWithin(std::size_t width) const {
  constexpr std::size_t kLeastFirst = 12, kLeastLast = 20;
  std::vector<std::size_t> widths(columns_.size(), 0);
  std::size_t all = kIndent;
  for (std::size_t i = 0; i < columns_.size(); ++i) {
    for (const auto& row : rows_) {
      if (i < row.size()) widths[i] = std::max(widths[i], row[i].columns());
    }
    all += widths[i] + (i > 0 ? kBetween : 0);
  }
  const auto narrow = [&](std::size_t column, std::size_t least) {
    if (width == 0 || all <= width) return;
    const std::size_t others = all - widths[column];
    const std::size_t narrowed =
        std::min(widths[column], std::max(least, width > others ? width - others : 0));
    all -= widths[column] - narrowed;
    widths[column] = narrowed;
  };
  if (columns_.size() > 1 && columns_.back() == Align::Left) narrow(columns_.size() - 1, kLeastLast);
  if (columns_.size() > 1) narrow(0, kLeastFirst);
  return widths;
}

std::vector<std::vector<ShownText>> Table::linesWithin(std::size_t width) const {
  const std::vector<std::size_t> widths = widthsWithin(width);
  const std::string between(kBetween, ' ');
  std::vector<std::vector<ShownText>> lines;
  for (const auto& row : rows_) {
    auto& ofRow = lines.emplace_back();
    ShownText text = std::string(kIndent, ' ');
    std::size_t column = kIndent;
    for (std::size_t i = 0; i < row.size(); ++i) {
      std::vector<ShownText> cell{row[i]};
      if (row[i].columns() > widths[i]) {
        if (i == 0 && row.size() > 1) {
          ofRow.push_back(text + row[i]);
          cell = {ShownText()};
        } else {
          cell = atSpaces(row[i], widths[i]);
        }
      }
      const std::string padding(widths[i] - std::min(widths[i], cell[0].columns()), ' ');
      text += columns_[i] == Align::Right ? padding + cell[0] : cell[0] + padding;
      if (i + 1 < row.size()) {
        text += between;
        column += widths[i] + kBetween;
        continue;
      }
      ofRow.push_back(text.withoutTrailingSpaces());
      for (std::size_t more = 1; more < cell.size(); ++more)
        ofRow.push_back(std::string(column, ' ') + cell[more]);
    }
  }
  return lines;
}

std::vector<ShownText> Table::lines() const {
  std::vector<ShownText> all;
  for (auto& ofRow : linesWithin(0)) all.push_back(std::move(ofRow.front()));
  return all;
}

void Table::print(Terminal& out) const {
  print(out, [](std::size_t) {});
}

void Table::print(Terminal& out, const std::function<void(std::size_t row)>& after) const {
  const auto all = linesWithin(out.lineWidth());
  for (std::size_t row = 0; row < all.size(); ++row) {
    for (const ShownText& text : all[row]) out.line(text);
    after(row);
  }
}

void printBars(Terminal& out, const std::vector<BarRow>& rows) {
  constexpr std::size_t kIndent = 6, kBetween = 2, kLeastBar = 10, kMostBar = 100;
  std::int64_t largest = 0;
  std::size_t labelWidth = 0, countWidth = 0;
  for (const BarRow& row : rows) {
    largest = std::max(largest, row.count);
    labelWidth = std::max(labelWidth, row.label.columns());
    countWidth = std::max(countWidth, std::to_string(row.count).size());
  }
  const std::size_t used = kIndent + labelWidth + kBetween + countWidth + kBetween;
  const std::size_t barWidth = std::clamp(out.width() > used ? out.width() - used : 0, kLeastBar, kMostBar);
  for (const BarRow& row : rows) {
    const std::string count = std::to_string(row.count);
    ShownText line = std::string(kIndent, ' ');
    line += row.label;
    line += std::string(labelWidth - row.label.columns() + kBetween + countWidth - count.size(), ' ') +
            count + std::string(kBetween, ' ') +
            out.bar(static_cast<double>(row.count), static_cast<double>(largest), barWidth);
    out.line(line.withoutTrailingSpaces());
  }
}

Progress::Progress(std::string label, Of what, std::uint64_t total)
    : label_(std::move(label)),
      what_(what),
      total_(total),
      shown_(::isatty(STDERR_FILENO) != 0),
      begin_(std::chrono::steady_clock::now()),
      nextDraw_(begin_ + kFirstDraw) {}

Progress::~Progress() {
  if (drawn_) std::fputs("\r\x1b[K", stderr);
}

void Progress::at(std::uint64_t done) {
  const auto now = std::chrono::steady_clock::now();
  if (!shown_ || now < nextDraw_) return;
  nextDraw_ = now + kRedraw;
  drawn_ = true;
  std::string line = label_;
  if (total_ != 0) {
    constexpr std::size_t kBarWidth = 30;
    const std::uint64_t bounded = std::min(done, total_);
    const auto filled = static_cast<std::size_t>(bounded * kBarWidth / total_);
    line += " [" + std::string(filled, '#') + std::string(kBarWidth - filled, '.') + "] " +
            std::to_string(bounded * 100 / total_) + " %";
  }
  if (what_ == Of::Bytes) {
    const double rate = static_cast<double>(done) / std::chrono::duration<double>(now - begin_).count();
    line +=
        (total_ == 0 ? ": " + sizeText(done) : "") + ", " + sizeText(static_cast<std::uint64_t>(rate)) + "/s";
    if (total_ > done && rate > 0)
      line += ", " + std::to_string(std::lround(static_cast<double>(total_ - done) / rate)) + " s left";
  }
  std::fprintf(stderr, "\r%s\x1b[K", line.c_str());
}

}  // namespace tbdaily

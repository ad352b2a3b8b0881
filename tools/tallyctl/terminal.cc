#include "tools/tallyctl/terminal.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <utility>

#include "platform/utf8.h"

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
  if (::isatty(STDOUT_FILENO) == 0) return;
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
  return static_cast<std::size_t>(
      std::count_if(bytes_.begin(), bytes_.end(), [](char c) { return !continuesCharacter(c); }));
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

void printError(const ShownText& reason) {
  std::fprintf(stderr, "tallyctl: %s\n", reason.bytes().c_str());
}

std::string sixDigits(double value) {
  std::array<char, 32> buffer;
  const int length = std::snprintf(buffer.data(), buffer.size(), "%.6g", value);
  return {buffer.data(), static_cast<std::size_t>(length)};
}

std::vector<ShownText> Table::lines() const {
  std::vector<std::size_t> widths(columns_.size(), 0);
  for (const auto& row : rows_) {
    for (std::size_t i = 0; i < row.size(); ++i) widths[i] = std::max(widths[i], row[i].columns());
  }
  std::vector<ShownText> lines;
  for (const auto& row : rows_) {
    ShownText text = "  ";
    for (std::size_t i = 0; i < row.size(); ++i) {
      const std::string padding(widths[i] - row[i].columns(), ' ');
      text += (columns_[i] == Align::Right ? padding + row[i] : row[i] + padding) + "  ";
    }
    lines.push_back(text.withoutTrailingSpaces());
  }
  return lines;
}

void Table::print(Terminal& out) const {
  for (const ShownText& text : lines()) out.line(text);
}

Progress::Progress(std::string label, std::uint64_t total)
    : label_(std::move(label)),
      total_(total),
      shown_(::isatty(STDERR_FILENO) != 0),
      nextDraw_(std::chrono::steady_clock::now() + kFirstDraw) {}

Progress::~Progress() {
  if (drawn_) std::fputs("\r\x1b[K", stderr);
}

void Progress::at(std::uint64_t done) {
  if (!shown_ || std::chrono::steady_clock::now() < nextDraw_) return;
  nextDraw_ = std::chrono::steady_clock::now() + kRedraw;
  drawn_ = true;
  if (total_ == 0) {
    std::fprintf(stderr, "\r%s: %llu MiB", label_.c_str(), static_cast<unsigned long long>(done >> 20));
    return;
  }
  constexpr std::size_t kBarWidth = 30;
  const auto filled = static_cast<std::size_t>(std::min(done, total_) * kBarWidth / total_);
  std::fprintf(stderr, "\r%s [%s%s] %3llu %%", label_.c_str(), std::string(filled, '#').c_str(),
               std::string(kBarWidth - filled, '.').c_str(),
               static_cast<unsigned long long>(std::min(done, total_) * 100 / total_));
}

}  // namespace tbdaily

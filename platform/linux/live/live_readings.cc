#include "platform/linux/live/live_readings.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <limits>

namespace tbdaily {

namespace {

constexpr std::size_t kUsualText = 4096, kLongestText = std::size_t{4} << 20;
constexpr ssize_t kShortText = kUsualText / 2;

bool isSpace(char c) {
  return c == ' ' || c == '\t' || c == '\n' || c == '\r';
}

// The next word of a line, taken from what is left of it; empty at its end.
std::string_view takeWord(std::string_view& line) {
  while (!line.empty() && isSpace(line.front())) line.remove_prefix(1);
  const auto end = std::ranges::find_if(line, isSpace);
  const std::string_view word = line.substr(0, static_cast<std::size_t>(end - line.begin()));
  line.remove_prefix(word.size());
  return word;
}

// The text of a cell, `rest` being its line behind the word that the line begins with.
std::string_view cellText(std::string_view rest, const TextCell& cell) {
  if (cell.label.empty()) {
    for (std::size_t skipped = 0; skipped < cell.word; ++skipped) takeWord(rest);
    return takeWord(rest);
  }
  for (std::string_view word = takeWord(rest); !word.empty(); word = takeWord(rest)) {
    if (word.starts_with(cell.label)) return word.substr(cell.label.size());
  }
  return {};
}

// Raised once: each source of a large machine is a file that stays open.
void raiseFileLimit() {
  static const bool isRaised = [] {
    rlimit limit{};
    if (::getrlimit(RLIMIT_NOFILE, &limit) != 0) return false;
    limit.rlim_cur = limit.rlim_max;
    return ::setrlimit(RLIMIT_NOFILE, &limit) == 0;
  }();
  static_cast<void>(isRaised);
}

// Whether so many files are open that the rest is needed for what is opened and closed again.
bool isNearFileLimit(int descriptor) {
  constexpr rlim_t kSpareFiles = 32;
  rlimit limit{};
  return ::getrlimit(RLIMIT_NOFILE, &limit) == 0 &&
         static_cast<rlim_t>(descriptor) + kSpareFiles >= limit.rlim_cur;
}

FileDescriptor openSource(const std::filesystem::path& file) {
  return FileDescriptor(::open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
}

class TextSource : public LiveSource {
 public:
  TextSource(std::filesystem::path file, std::vector<TextCell> cells)
      : file_(std::move(file)), cells_(std::move(cells)), text_(kUsualText, '\0') {
    raiseFileLimit();
    descriptor_ = openSource(file_);
    if (descriptor_.isOpen() && isNearFileLimit(descriptor_.get())) descriptor_.reset();
    // As long as it is now, with room to grow: later reads allocate nothing.
    if (const auto now = liveText(file_)) text_.resize(std::max(kUsualText, now->size() * 2));
  }

  void read(Readings& readings) override {
    const FileDescriptor passing = descriptor_.isOpen() ? FileDescriptor() : openSource(file_);
    const int file = descriptor_.isOpen() ? descriptor_.get() : passing.get();
    std::size_t filled = 0;
    while (filled < text_.size()) {
      const ssize_t count =
          ::pread(file, text_.data() + filled, text_.size() - filled, static_cast<off_t>(filled));
      if (count < 0 && errno == EINTR) continue;
      if (count < 0) return;
      filled += static_cast<std::size_t>(count);
      // The kernel hands out whole lines until a page is full: what ends before its half is all.
      if (count <= kShortText) break;
    }
    std::string_view text(text_.data(), filled);
    // Longer than there is room for: the line that was cut says nothing.
    if (filled == text_.size()) text = text.substr(0, text.rfind('\n') + 1);
    readCells(text, cells_, readings);
  }

 private:
  const std::filesystem::path file_;
  const std::vector<TextCell> cells_;
  FileDescriptor descriptor_;
  std::string text_;
};

}  // namespace

std::optional<std::int64_t> liveNumber(std::string_view text, NumberRange range) {
  while (!text.empty() && isSpace(text.front())) text.remove_prefix(1);
  while (!text.empty() && isSpace(text.back())) text.remove_suffix(1);
  std::int64_t value = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (text.empty() || error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  if (value == std::numeric_limits<std::int64_t>::min()) return std::nullopt;
  if (range == NumberRange::Counter && text.front() == '-') return std::nullopt;
  return value;
}

std::optional<std::int64_t> cellNumber(std::string_view text, const TextCell& cell) {
  if (cell.isAlone) return liveNumber(text, cell.range);
  while (!text.empty()) {
    std::string_view line = takeLine(text);
    if (cell.line.empty() || takeWord(line) == cell.line) return liveNumber(cellText(line, cell), cell.range);
  }
  return std::nullopt;
}

void readCells(std::string_view text, const std::vector<TextCell>& cells, Readings& readings) {
  if (cells.empty()) return;
  if (cells.front().isAlone) {
    const auto number = liveNumber(text, cells.front().range);
    if (number) readings[cells.front().slot] = *number;
    return;
  }
  const auto groupEnd = [&cells](std::size_t first) {
    std::size_t end = first;
    while (end < cells.size() && cells[end].line == cells[first].line) ++end;
    return end;
  };
  // Lines come in the order of the cells as a rule: the next group is tried first, then all in turn.
  std::size_t expected = 0, found = 0;
  while (!text.empty() && found < cells.size()) {
    const std::string_view whole = takeLine(text);
    std::string_view line = whole;
    const std::string_view word = takeWord(line);
    std::size_t group = expected;
    for (std::size_t tried = 0; tried < cells.size();) {
      if (cells[group].line.empty() || cells[group].line == word) break;
      const std::size_t end = groupEnd(group);
      tried += end - group;
      group = end == cells.size() ? 0 : end;
      if (tried >= cells.size()) group = cells.size();
    }
    if (group == cells.size()) continue;
    const std::size_t end = groupEnd(group);
    for (std::size_t i = group; i < end; ++i) {
      const auto number =
          liveNumber(cellText(cells[i].line.empty() ? whole : line, cells[i]), cells[i].range);
      if (number) readings[cells[i].slot] = *number;
    }
    found += end - group;
    expected = end == cells.size() ? 0 : end;
  }
}

std::unique_ptr<LiveSource> openTextSource(const std::filesystem::path& file, std::vector<TextCell> cells) {
  return std::make_unique<TextSource>(file, std::move(cells));
}

std::optional<std::string> liveText(const std::filesystem::path& file) {
  FileContents contents;
  if (readHostFile(file, contents, kLongestText) != 0) return std::nullopt;
  return std::string(contents.text());
}

}  // namespace tbdaily

#define NCURSES_NOMACROS 1

#include "tools/tallyctl/metrics/watch_screen.h"

#include <curses.h>
#include <langinfo.h>
#include <unistd.h>

#include <algorithm>
#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <cwchar>

#include "platform/calendar.h"
#include "tools/tallyctl/metrics/held_errors.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

namespace {

constexpr int kTitleLines = 2, kKeyLines = 1;
constexpr int kEnter = '\n', kReturn = '\r', kEscape = 27, kErase = 127, kBackspace = 8;

// What the terminal can show of a text: escapes for controls, '?' for what its locale does not have.
std::wstring shownCharacters(std::string_view text) {
  const ShownText safe(text);
  std::string_view rest = safe.bytes();
  std::wstring characters;
  std::mbstate_t state{};
  while (!rest.empty()) {
    wchar_t character = L'?';
    const std::size_t length = std::mbrtowc(&character, rest.data(), rest.size(), &state);
    const bool isOne = length != 0 && length <= rest.size() && ::wcwidth(character) >= 0;
    characters.push_back(isOne ? character : L'?');
    rest.remove_prefix(length != 0 && length <= rest.size() ? length : 1);
    if (!isOne) state = {};
  }
  return characters;
}

int columnsOf(const std::wstring& text) {
  int columns = 0;
  for (const wchar_t character : text) columns += std::max(::wcwidth(character), 0);
  return columns;
}

// As much of the text as so many columns hold, with a '~' where it was cut.
std::wstring cut(std::wstring text, int columns) {
  if (columnsOf(text) <= columns) return text;
  while (!text.empty() && columnsOf(text) > columns - 1) text.pop_back();
  return columns > 0 ? text + L'~' : std::wstring();
}

// Columns of the screen: a name, then numbers to the right.
struct Widths {
  int name = 0, figure = 0, human = 0, rate = 0;
};

constexpr int kGap = 2;

class CursesScreen : public WatchScreen {
 public:
  CursesScreen(SCREEN* screen, double interval) : screen_(screen), interval_(interval) {
    ::set_term(screen_);
    ::cbreak();
    ::noecho();
    ::nonl();
    ::curs_set(0);
    ::keypad(stdscr, TRUE);
    ::nodelay(stdscr, TRUE);
    ::set_escdelay(25);
  }
  ~CursesScreen() override {
    ::endwin();
    ::delscreen(screen_);
  }
  CursesScreen(const CursesScreen&) = delete;
  CursesScreen& operator=(const CursesScreen&) = delete;

  void show(PlistDate time, std::vector<ChannelValues> channels, double secondsAgo) override {
    earlier_ = {std::move(channels_), secondsAgo};
    channels_ = std::move(channels);
    time_ = time;
    arrange();
  }

  bool takeKeys() override {
    for (int key = ::getch(); key != ERR; key = ::getch()) {
      if (typesFilter_)
        typeFilter(key);
      else if (!follow(key))
        return false;
    }
    draw();
    return true;
  }

  bool isPaused() const override { return paused_; }

 private:
  bool follow(int key) {
    switch (key) {
      case 'q':
      case 'Q':
        return false;
      case ' ':
      case 'p':
        paused_ = !paused_;
        break;
      case '/':
        typesFilter_ = true;
        break;
      case kEscape:
        filter_.clear();
        arrange();
        break;
      case KEY_UP:
      case 'k':
        --top_;
        break;
      case KEY_DOWN:
      case 'j':
        ++top_;
        break;
      case KEY_PPAGE:
        top_ -= room();
        break;
      case KEY_NPAGE:
        top_ += room();
        break;
      case KEY_HOME:
      case 'g':
        top_ = 0;
        break;
      case KEY_END:
      case 'G':
        top_ = static_cast<int>(rows_.size());
        break;
      case KEY_RESIZE:
        ::clear();
        break;
      default:
        break;
    }
    return true;
  }

  void typeFilter(int key) {
    if (key == kEnter || key == kReturn || key == KEY_ENTER) {
      typesFilter_ = false;
    } else if (key == kEscape) {
      typesFilter_ = false;
      filter_.clear();
    } else if (key == kErase || key == kBackspace || key == KEY_BACKSPACE) {
      // All bytes of the last character.
      while (!filter_.empty() && (static_cast<unsigned char>(filter_.back()) & 0xC0) == 0x80)
        filter_.pop_back();
      if (!filter_.empty()) filter_.pop_back();
    } else if (key >= ' ' && key <= 0xFF) {
      filter_.push_back(static_cast<char>(key));
    }
    top_ = 0;
    arrange();
  }

  // Rows of the channels, as wide as they need.
  void arrange() {
    rows_ = watchRows(channels_, earlier_, filter_);
    widths_ = {};
    for (const WatchRow& row : rows_) {
      if (row.isHeading) continue;
      widths_.name = std::max(widths_.name, columnsOf(shownCharacters(row.name)));
      widths_.figure = std::max(widths_.figure, columnsOf(shownCharacters(row.figure)));
      widths_.human = std::max(widths_.human, columnsOf(shownCharacters(row.human)));
      widths_.rate = std::max(widths_.rate, columnsOf(shownCharacters(row.rate)));
    }
    widths_.rate = std::max(widths_.rate, 10);
    draw();
  }

  static int room() { return std::max(LINES - kTitleLines - kKeyLines, 1); }

  void draw() {
    top_ = std::clamp(top_, 0, std::max(static_cast<int>(rows_.size()) - room(), 0));
    ::erase();
    const int numbers = widths_.figure + widths_.human + widths_.rate + 4 * kGap;
    const int name = std::min(widths_.name, std::max(COLS - numbers, 16));
    drawTitle(name);
    int line = kTitleLines;
    for (auto i = static_cast<std::size_t>(top_); i < rows_.size() && line < kTitleLines + room(); ++i)
      drawRow(line++, rows_[i], name);
    drawKeys();
    ::refresh();
  }

  // From that column on, cut at the window's edge.
  static void put(int line, int column, std::wstring text) {
    text = cut(std::move(text), COLS - column);
    if (column < COLS) ::mvaddnwstr(line, column, text.data(), static_cast<int>(text.size()));
  }
  static void putRight(int line, int end, const std::wstring& text) {
    put(line, std::max(end - columnsOf(text), 0), text);
  }

  void drawTitle(int name) const {
    std::string title =
        "tallyctl metrics watch   " + stampText(time_, 3) + "   every " + sixDigits(interval_) + " s";
    if (paused_) title += "   PAUSED";
    const std::size_t last =
        std::min(rows_.size(), static_cast<std::size_t>(top_) + static_cast<std::size_t>(room()));
    ::attron(A_BOLD);
    put(0, 0, shownCharacters(title));
    ::attroff(A_BOLD);
    putRight(0, COLS,
             shownCharacters("  " + std::to_string(rows_.empty() ? 0 : top_ + 1) + "-" +
                             std::to_string(last) + " of " + std::to_string(rows_.size())));
    ::attron(A_REVERSE);
    ::mvhline(1, 0, ' ', COLS);
    put(1, kGap, L"channel");
    putRight(1, kGap + name + kGap + widths_.figure, L"value");
    putRight(1, rateEnd(name), L"per second");
    ::attroff(A_REVERSE);
  }

  int rateEnd(int name) const { return name + widths_.figure + widths_.human + widths_.rate + 4 * kGap; }

  void drawRow(int line, const WatchRow& row, int name) const {
    if (row.isHeading) {
      ::attron(A_BOLD);
      put(line, 0, shownCharacters(row.name));
      ::attroff(A_BOLD);
      return;
    }
    int end = kGap + name;
    put(line, kGap, cut(shownCharacters(row.name), name));
    if (!row.shares.empty()) return put(line, end + kGap, shownCharacters(row.shares));
    for (const auto& [text, width] :
         {std::pair(&row.figure, widths_.figure), {&row.human, widths_.human}, {&row.rate, widths_.rate}}) {
      end += kGap + width;
      if (!text->empty()) putRight(line, end, shownCharacters(*text));
    }
  }

  void drawKeys() const {
    const int line = LINES - 1;
    if (line < kTitleLines) return;
    if (typesFilter_)
      return put(line, 0, shownCharacters("filter: " + filter_ + "_   Enter keeps it, Esc shows all"));
    put(line, 0,
        shownCharacters("q end   space " + std::string(paused_ ? "go on" : "pause") + "   / filter" +
                        (filter_.empty() ? "" : ": " + filter_ + "   Esc shows all") +
                        "   arrows, PgUp, PgDn scroll"));
  }

  const HeldErrors errors_;
  SCREEN* const screen_;
  const double interval_;
  PlistDate time_{};
  std::vector<ChannelValues> channels_;
  EarlierSample earlier_;
  std::vector<WatchRow> rows_;
  Widths widths_;
  std::string filter_;
  int top_ = 0;
  bool paused_ = false, typesFilter_ = false;
};

}  // namespace

std::unique_ptr<WatchScreen> WatchScreen::open(double interval) {
  if (::isatty(STDIN_FILENO) == 0 || ::isatty(STDOUT_FILENO) == 0) return nullptr;
  std::setlocale(LC_CTYPE, "");
  const char* type = std::getenv("TERM");
  if (type == nullptr || *type == '\0' || std::string_view(type) == "dumb") return nullptr;
  SCREEN* screen = ::newterm(nullptr, stdout, stdin);
  // What cannot be cleared is no screen: there samples are lines.
  if (screen == nullptr) return nullptr;
  if (::tigetstr("clear") == nullptr || ::tigetstr("cup") == nullptr) {
    ::endwin();
    ::delscreen(screen);
    return nullptr;
  }
  return std::make_unique<CursesScreen>(screen, interval);
}

}  // namespace tbdaily

#include "platform/linux/os_release.h"

#include "platform/linux/base/file_io.h"

namespace tbdaily {

namespace {

constexpr std::size_t kMaximumSize = std::size_t{1} << 16;

// The file is a list of shell assignments: a value may be quoted, and a backslash takes the next character as
// it is; in double quotes only one that would mean something there.
std::string unquote(std::string_view text) {
  std::string value;
  char quote = '\0';
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char c = text[i];
    const std::string_view next = text.substr(i + 1, 1);
    const bool escapes =
        quote == '\0' || (quote == '"' && std::string_view("\"\\$`").find(next) != next.npos);
    if (c == '\\' && escapes && !next.empty()) {
      value += text[++i];
    } else if (quote == '\0' && (c == '"' || c == '\'')) {
      quote = c;
    } else if (c == quote) {
      quote = '\0';
    } else {
      value += c;
    }
  }
  return value;
}

}  // namespace

std::optional<std::string> osReleaseValue(const Host& host, std::string_view variable) {
  for (const std::string_view place : {"/etc/os-release", "/usr/lib/os-release"}) {
    FileContents file;
    if (readHostFile(host.livePath(place), file, kMaximumSize) != 0) continue;
    std::optional<std::string> last;  // of two assignments the later one holds
    for (std::string_view rest = file.text(); !rest.empty();) {
      const std::string_view line = takeLine(rest);
      const std::size_t equals = line.find('=');
      if (equals != line.npos && line.substr(0, equals) == variable) last = unquote(line.substr(equals + 1));
    }
    return last && !last->empty() ? last : std::nullopt;
  }
  return std::nullopt;
}

}  // namespace tbdaily

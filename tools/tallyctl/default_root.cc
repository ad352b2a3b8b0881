#include "tools/tallyctl/default_root.h"

#include <cerrno>
#include <stdexcept>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace {

constexpr std::size_t kLargestDefaults = 64 << 10;
constexpr std::string_view kSpace = " \t\r";

std::string_view trimmed(std::string_view text) {
  const auto first = text.find_first_not_of(kSpace);
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(kSpace) - first + 1);
}

// Without its quotes, where it begins with one; a backslash takes the next character as it is, but in single
// quotes.
std::string unquoted(std::string_view value) {
  const char quote = !value.empty() && (value[0] == '"' || value[0] == '\'') ? value[0] : '\0';
  if (quote != '\0') value.remove_prefix(1);
  std::string plain;
  for (std::size_t i = 0; i < value.size(); ++i) {
    if (quote != '\0' && value[i] == quote) break;
    if (quote != '\'' && value[i] == '\\' && i + 1 < value.size()) ++i;
    plain += value[i];
  }
  return plain;
}

}  // namespace

std::optional<std::string> valueFromDefaults(std::string_view text, std::string_view name) {
  std::optional<std::string> found;
  while (!text.empty()) {
    const std::string_view line = trimmed(text.substr(0, text.find('\n')));
    text.remove_prefix(std::min(text.size(), text.find('\n')));
    text.remove_prefix(text.empty() ? 0 : 1);
    const auto equals = line.find('=');
    if (line.empty() || line[0] == '#' || line[0] == ';' || equals == std::string_view::npos) continue;
    if (trimmed(line.substr(0, equals)) == name) found = unquoted(trimmed(line.substr(equals + 1)));
  }
  return found && !found->empty() ? found : std::nullopt;
}

std::optional<std::string> rootFromDefaults(const std::filesystem::path& file) {
  FileContents contents;
  const int error = readHostFile(file, contents, kLargestDefaults);
  if (error == ENOENT || error == ENOTDIR) return std::nullopt;
  if (error != 0)
    throw std::runtime_error(file.native() + ", which may name the device root, cannot be read: " +
                             errorText(error) + "; correct it, or name the root with --root");
  return valueFromDefaults(contents.text(), "TBDAILY_ROOT");
}

}  // namespace tbdaily

#include "tools/tallyctl/key_selection.h"

#include <algorithm>

namespace tbdaily {

namespace {

char lower(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

bool isSameLetter(char a, char b) {
  return lower(a) == lower(b);
}

}  // namespace

bool isSelected(std::string_view key, const std::vector<std::string>& words) {
  return words.empty() || std::any_of(words.begin(), words.end(), [key](const std::string& word) {
           return std::search(key.begin(), key.end(), word.begin(), word.end(), isSameLetter) != key.end() ||
                  word.empty();
         });
}

bool equalsIgnoringCase(std::string_view a, std::string_view b) {
  return a.size() == b.size() && std::equal(a.begin(), a.end(), b.begin(), isSameLetter);
}

}  // namespace tbdaily

#include "platform/linux/linux_locale_settings.h"

#include <algorithm>
#include <cstdlib>

namespace tbdaily {

namespace {

std::string_view environment(const char* variable) {
  const char* text = std::getenv(variable);
  return text != nullptr ? text : "";
}

// "de_AT.UTF-8@euro" to "de-AT"; the locales that name no language give an empty text.
std::string languageTag(std::string_view locale) {
  std::string tag(locale.substr(0, locale.find_first_of(".@")));
  if (tag == "C" || tag == "POSIX") return {};
  std::replace(tag.begin(), tag.end(), '_', '-');
  return tag;
}

void addOnce(std::vector<std::string>& list, std::string text) {
  if (!text.empty() && std::find(list.begin(), list.end(), text) == list.end())
    list.push_back(std::move(text));
}

// For comparison: lower case, `_` as `-`.
std::string folded(std::string_view language) {
  std::string text(language);
  for (char& c : text) {
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    if (c == '_') c = '-';
  }
  return text;
}

}  // namespace

std::optional<std::vector<std::string>> LinuxLocaleSettings::recordedList(std::string_view key) {
  const PlistValue value = recordings_.entry(recording::kLocale, key);
  if (value.asArray() == nullptr) return std::nullopt;
  std::vector<std::string> list;
  for (const PlistValue& element : *value.asArray()) {
    if (const auto text = element.asString()) list.emplace_back(*text);
  }
  return list;
}

std::vector<std::string> LinuxLocaleSettings::preferredLanguages() {
  if (auto recorded = recordedList("preferredLanguages")) return *recorded;
  std::vector<std::string> languages;
  if (!host_.live()) return languages;
  std::string_view list = environment("LANGUAGE");
  while (!list.empty()) {
    const std::size_t colon = list.find(':');
    addOnce(languages, languageTag(list.substr(0, colon)));
    list = colon == std::string_view::npos ? std::string_view() : list.substr(colon + 1);
  }
  for (const char* variable : {"LC_ALL", "LC_MESSAGES", "LANG"}) {
    if (const std::string_view locale = environment(variable); !locale.empty()) {
      addOnce(languages, languageTag(locale));
      break;  // the first that is set decides, as for the C library
    }
  }
  return languages;
}

std::vector<std::string> LinuxLocaleSettings::systemLanguages() {
  if (auto recorded = recordedList("systemLanguages")) return *recorded;
  std::vector<std::string> languages;
  if (!host_.live()) return languages;
  std::error_code error;
  std::filesystem::directory_iterator entries(host_.livePath("/usr/share/locale"), error);
  for (; !error && entries != std::filesystem::directory_iterator(); entries.increment(error)) {
    std::error_code ignored;
    const std::string name = entries->path().filename().native();
    // A name with a modifier ("ca@valencia") is a variant of a language that has a folder of its own.
    if (entries->is_directory(ignored) && name.find('@') == std::string::npos)
      addOnce(languages, languageTag(name));
  }
  std::sort(languages.begin(), languages.end());
  return languages;
}

std::vector<std::string> LinuxLocaleSettings::bestLocalizations(std::span<const std::string> available,
                                                                std::span<const std::string> preferred) {
  std::vector<std::string> foldedAvailable;
  for (const std::string& language : available) foldedAvailable.push_back(folded(language));

  std::vector<std::string> best;
  for (const std::string& wanted : preferred) {
    const std::string foldedWanted = folded(wanted);
    const std::string* match = nullptr;
    std::size_t matchLength = 0;
    // An equal language is also the longest one that the wanted one begins with.
    for (std::size_t i = 0; i < available.size(); ++i) {
      const std::string& candidate = foldedAvailable[i];
      if (candidate.size() <= matchLength || !foldedWanted.starts_with(candidate)) continue;
      match = &available[i];
      matchLength = candidate.size();
    }
    if (match != nullptr) addOnce(best, *match);
  }
  return best;
}

std::optional<std::string> LinuxLocaleSettings::countryCode() {
  const PlistValue recorded = recordings_.entry(recording::kLocale, "countryCode");
  if (const auto text = recorded.asString()) return std::string(*text);
  if (!host_.live()) return std::nullopt;
  const std::string_view all = environment("LC_ALL");
  const std::string tag = languageTag(all.empty() ? environment("LANG") : all);
  const std::size_t dash = tag.rfind('-');
  if (dash == std::string::npos || dash + 1 == tag.size()) return std::nullopt;
  return tag.substr(dash + 1);
}

}  // namespace tbdaily

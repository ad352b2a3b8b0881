// Languages and region.
//
// Absent settings: empty lists, no country code.
#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

namespace tbdaily {

class LocaleSettings {
 public:
  virtual ~LocaleSettings() = default;
  virtual std::vector<std::string> preferredLanguages() = 0;  // most preferred first
  virtual std::vector<std::string> systemLanguages() = 0;
  // The best of `available` for `preferred`, best first: for each preferred language in turn the available
  // one that equals it, else the longest one that it begins with; without regard to case, `_` as `-`; each
  // once.
  virtual std::vector<std::string> bestLocalizations(std::span<const std::string> available,
                                                     std::span<const std::string> preferred) = 0;
  virtual std::optional<std::string> countryCode() = 0;
};

}  // namespace tbdaily

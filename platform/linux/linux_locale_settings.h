// Languages and region: recorded, else those of the process environment and the host's message catalogues.
#pragma once

#include "platform/linux/replay/recordings.h"
#include "platform/locale_settings.h"

namespace tbdaily {

class LinuxLocaleSettings : public LocaleSettings {
 public:
  LinuxLocaleSettings(const Host& host, Recordings& recordings) : host_(host), recordings_(recordings) {}
  std::vector<std::string> preferredLanguages() override;
  std::vector<std::string> systemLanguages() override;
  std::vector<std::string> bestLocalizations(std::span<const std::string> available,
                                             std::span<const std::string> preferred) override;
  std::optional<std::string> countryCode() override;

 private:
  std::optional<std::vector<std::string>> recordedList(std::string_view key);

  const Host& host_;
  Recordings& recordings_;
};

}  // namespace tbdaily

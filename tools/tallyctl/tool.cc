#include "tools/tallyctl/tool.h"

#include <cstdlib>

#include "platform/linux/base/host_notes.h"
#include "tools/tallyctl/day_argument.h"
#include "tools/tallyctl/default_root.h"

namespace tbdaily {

LinuxPlatform& Tool::platform() {
  if (!platform_) {
    std::string root = options.root;
    if (!namesRoot()) root = rootFromDefaults(kDefaultsFile).value_or("");
    if (!root.empty()) ::setenv("TBDAILY_ROOT", root.c_str(), 1);
    platform_ = std::make_unique<LinuxPlatform>(Host::fromEnvironment());
  }
  return *platform_;
}

bool Tool::namesRoot() const {
  const char* root = std::getenv("TBDAILY_ROOT");
  return !options.root.empty() || (root != nullptr && *root != '\0');
}

bool Tool::hasUsableRoot() {
  const Host& host = platform().host();
  const int error = host.files().examineRoot();
  if (error == 0) return true;
  fail("the device root " + host.root().native() + " cannot be used: " + errorText(error) +
       "; make a device there with tallyctl init, or name another --root");
  return false;
}

bool Tool::hasReadAll() {
  if (!platform().host().files().hasUnread()) return true;
  exitStatus = kFailed;
  return false;
}

bool Tool::printedAsJson(const PlistValue& value) {
  return printedAsJson([&value](JsonWriter& json) { json.add(value); });
}

bool Tool::printedAsJson(const std::function<void(JsonWriter& json)>& write) {
  if (!options.json) return false;
  JsonWriter json(JsonLayout::Indented);
  write(json);
  out_.line(ShownText::lines(json.take()));
  return true;
}

std::optional<DayNumber> Tool::dayOf(const std::string& text) {
  if (!hasUsableRoot()) return std::nullopt;  // which may hold the clock
  const auto day = parseDay(text, platform().services().analyticsClient.currentDayNumber());
  if (day) return *day;
  fail(day.reason(), kWrongUsage);
  return std::nullopt;
}

void Tool::mayPage() {
  if (!options.json && !options.noPager) out_.usePager();
}

void Tool::fail(std::string_view reason, int status) {
  std::string line(reason);
  if (status == kFailed && platform_) {
    const std::string& root = platform_->host().root().native();
    if (line.find(root) == std::string::npos || root == "/") line += " (device root " + root + ")";
  }
  printError(line);
  exitStatus = status;
}

}  // namespace tbdaily

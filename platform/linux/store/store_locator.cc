#include "platform/linux/store/store_locator.h"

#include <utility>

namespace tbdaily {

namespace {

constexpr const char* kSingleUserHome = "/var/mobile";
constexpr const char* kContainer = "systemgroup.com.velmora.sysmetrics";
constexpr const char* kForceMultiUserMode = "/var/db/forceMultiUserMode";  // honoured on internal builds
constexpr const char* kStoreFile = "/Library/Tallybook/TBDataStore.sqlitedb";

bool isMultiUser(DeviceAnswers& answers, FileSystem& files) {
  if (answers.booleanAnswer("InternalBuild") && files.status(kForceMultiUserMode)) return true;
  return answers.multiUserMode().value_or(false);
}

}  // namespace

std::optional<std::string> analyticsHome(DeviceAnswers& answers, FileSystem& files) {
  if (!isMultiUser(answers, files)) return kSingleUserHome;
  return answers.systemGroupContainerPath(kContainer).path;
}

AnalyticsStoreLocator analyticsStoreLocator(const Host& host, DeviceAnswers& answers, FileSystem& files) {
  return [&host, &answers, &files,
          found = std::optional<std::filesystem::path>()]() mutable -> std::optional<std::filesystem::path> {
    if (found) return found;
    // A root that is not there holds no store, and none is made in its place: this names it.
    if (host.makeFolders(host.root()) != 0) return std::nullopt;
    if (const std::optional<std::string> home = analyticsHome(answers, files)) {
      found = host.devicePath(*home + kStoreFile);
    }
    return found;
  };
}

}  // namespace tbdaily

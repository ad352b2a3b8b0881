#include "platform/analytics_home.h"

#include <string_view>
#include <utility>

namespace tbdaily {

namespace {
constexpr std::string_view kSingleUserHome = "/var/mobile";
constexpr std::string_view kMultiUserContainer = "systemgroup.com.velmora.sysmetrics";
constexpr std::string_view kForceMultiUserMarker = "/var/db/forceMultiUserMode";
}  // namespace

UserMode AnalyticsHome::decidedMode() const {
  if (deviceAnswers_.booleanAnswer("InternalBuild") && fileSystem_.status(kForceMultiUserMarker)) {
    return UserMode::ForcedMultiUser;
  }
  return deviceAnswers_.multiUserMode().value_or(false) ? UserMode::MultiUser : UserMode::SingleUser;
}

AnalyticsHome::Answer AnalyticsHome::find() {
  const std::lock_guard lock(mutex_);
  if (!mode_) mode_ = decidedMode();
  if (path_) return {*mode_, &*path_, 0};
  if (*mode_ == UserMode::SingleUser) return {*mode_, &path_.emplace(kSingleUserHome), 0};
  SystemGroupContainer container = deviceAnswers_.systemGroupContainerPath(kMultiUserContainer);
  if (!container.path) return {*mode_, nullptr, container.error};
  return {*mode_, &path_.emplace(std::move(*container.path)), 0};
}

std::string analyticsDatabasePath(const std::string& homePath) {
  return homePath + "/Library/Tallybook/TBDataStore.sqlitedb";
}

}  // namespace tbdaily

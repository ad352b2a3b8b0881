// The outside world of the job: one reference for each service family. Whoever makes a Platform owns the
// services and keeps them alive; everything else takes a Platform& (or the one family that it needs) as its
// first parameter.
#pragma once

#include <type_traits>

namespace tbdaily {

class AnalyticsClient;
class AnalyticsHistory;
class AnalyticsHome;
class AppRegistry;
class DeviceAnswers;
class Diagnostics;
class DriverRegistry;
class DynamicLoader;
class FileSystem;
class Kernel;
class LocaleSettings;
class LogSubmission;
class MessageDigest;
class Notifications;
class PreferencesStore;
class PropertyListCodec;
class RunLock;
class ServiceListener;
class StackSnapshot;
class SystemLog;
class UsageService;

struct Platform {
  DriverRegistry& driverRegistry;
  PreferencesStore& preferences;
  DeviceAnswers& deviceAnswers;
  LogSubmission& logSubmission;
  AnalyticsClient& analyticsClient;
  AnalyticsHistory& analyticsHistory;
  PropertyListCodec& propertyListCodec;
  StackSnapshot& stackSnapshot;
  UsageService& usageService;
  AppRegistry& appRegistry;
  LocaleSettings& localeSettings;
  ServiceListener& serviceListener;
  Notifications& notifications;
  SystemLog& systemLog;
  Kernel& kernel;
  FileSystem& fileSystem;
  DynamicLoader& dynamicLoader;
  MessageDigest& messageDigest;
  Diagnostics& diagnostics;
  RunLock& runLock;
  AnalyticsHome& analyticsHome;  // no family of its own: a rule over two of them
};

namespace platform_with {

template <typename Family>
Family& chosen(Family& own) {
  return own;
}
template <typename Family, typename First, typename... Rest>
Family& chosen(Family& own, First& first, Rest&... rest) {
  if constexpr (std::is_base_of_v<Family, First>) {
    return first;
  } else {
    return chosen<Family>(own, rest...);
  }
}

}  // namespace platform_with

// The platform's services, but for each one given that one in the place of its family's. Borrows all of them.
template <typename... Services>
Platform platformWith(const Platform& p, Services&... replacements) {
  const auto of = [&](auto& own) -> auto& {
    return platform_with::chosen(own, replacements...);
  };
  return {of(p.driverRegistry),    of(p.preferences),     of(p.deviceAnswers),
          of(p.logSubmission),     of(p.analyticsClient), of(p.analyticsHistory),
          of(p.propertyListCodec), of(p.stackSnapshot),   of(p.usageService),
          of(p.appRegistry),       of(p.localeSettings),  of(p.serviceListener),
          of(p.notifications),     of(p.systemLog),       of(p.kernel),
          of(p.fileSystem),        of(p.dynamicLoader),   of(p.messageDigest),
          of(p.diagnostics),       of(p.runLock),         of(p.analyticsHome)};
}

}  // namespace tbdaily

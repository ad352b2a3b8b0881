// The outside world of the job: one reference for each service family. Whoever makes a Platform owns the
// services and keeps them alive; everything else takes a Platform& (or the one family that it needs) as its
// first parameter.
#pragma once

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
  AnalyticsHome& analyticsHome;  // no family of its own: a rule over two of them
};

}  // namespace tbdaily

// A platform of fakes: `FakePlatform fake; RunDailyTasks(fake.platform, ...)`.
#pragma once

#include "platform/analytics_home.h"
#include "platform/platform.h"
#include "testing/fake_analytics.h"
#include "testing/fake_diagnostics.h"
#include "testing/fake_drivers.h"
#include "testing/fake_log_submission.h"
#include "testing/fake_property_list_codec.h"
#include "testing/fake_services.h"

namespace tbdaily::testing {

struct FakePlatform {
  FakePlatform();
  ~FakePlatform();
  FakePlatform(const FakePlatform&) = delete;
  FakePlatform& operator=(const FakePlatform&) = delete;

  FakeDriverRegistry driverRegistry;
  FakePreferences preferences;
  FakeDeviceAnswers deviceAnswers;
  FakeLogSubmission logSubmission;
  FakeAnalyticsClient analyticsClient;
  FakeAnalyticsHistory analyticsHistory;
  FakePropertyListCodec propertyListCodec;
  FakeStackSnapshot stackSnapshot;
  FakeUsageService usageService;
  FakeAppRegistry appRegistry;
  FakeLocaleSettings localeSettings;
  FakeServiceListener serviceListener;
  FakeNotifications notifications;
  FakeSystemLog systemLog;
  FakeKernel kernel;
  FakeFileSystem fileSystem;
  FakeDynamicLoader dynamicLoader;
  FakeMessageDigest messageDigest;
  FakeDiagnostics diagnostics;
  FakeRunLock runLock;
  AnalyticsHome analyticsHome{deviceAnswers, fileSystem};

  Platform platform{driverRegistry,   preferences,       deviceAnswers, logSubmission, analyticsClient,
                    analyticsHistory, propertyListCodec, stackSnapshot, usageService,  appRegistry,
                    localeSettings,   serviceListener,   notifications, systemLog,     kernel,
                    fileSystem,       dynamicLoader,     messageDigest, diagnostics,   runLock,
                    analyticsHome};

  // Puts a property list into a file.
  void putPlist(std::string_view path, const PlistDictionary& root);
  // The value that a log's bytes hold.
  PlistValue plistOf(const FakeLogSubmission::Log& log);
};

}  // namespace tbdaily::testing

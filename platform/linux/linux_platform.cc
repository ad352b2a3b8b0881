#include "platform/linux/linux_platform.h"

#include <utility>

#include "platform/diagnostics.h"
#include "platform/linux/linux_app_registry.h"
#include "platform/linux/linux_device_answers.h"
#include "platform/linux/linux_dynamic_loader.h"
#include "platform/linux/linux_file_system.h"
#include "platform/linux/linux_kernel.h"
#include "platform/linux/linux_locale_settings.h"
#include "platform/linux/linux_log_submission.h"
#include "platform/linux/linux_message_digest.h"
#include "platform/linux/linux_notifications.h"
#include "platform/linux/linux_preferences.h"
#include "platform/linux/linux_run_lock.h"
#include "platform/linux/linux_service_listener.h"
#include "platform/linux/linux_system_log.h"
#include "platform/linux/live/host_driver_registry.h"
#include "platform/linux/replay/recorded_stack_snapshot.h"
#include "platform/linux/replay/recorded_usage_service.h"
#include "platform/linux/replay/recordings.h"
#include "platform/linux/store/sqlite_analytics_client.h"
#include "platform/linux/store/sqlite_analytics_history.h"
#include "platform/linux/store/store_locator.h"
#include "platform/plist/codec.h"

namespace tbdaily {

// In the order in which each needs those above it.
struct LinuxPlatform::Families {
  explicit Families(Host h) : host(std::move(h)) {}

  const Host host;
  PlistCodec codec;
  Recordings recordings{host, codec};
  LinuxKernel kernel{host, recordings};
  LinuxDeviceAnswers deviceAnswers{host, recordings};
  LinuxFileSystem fileSystem{host};
  LinuxRunLock runLock{host};
  LinuxPreferences preferences{host, codec};
  LinuxLogSubmission logSubmission{host, recordings, codec, preferences, kernel};
  AnalyticsHome analyticsHome{deviceAnswers, fileSystem};
  AnalyticsStoreLocator storeLocator = analyticsStoreLocator(host, analyticsHome);
  SqliteAnalyticsClient analyticsClient{storeLocator, kernel};
  SqliteAnalyticsHistory analyticsHistory{storeLocator};
  LinuxAppRegistry appRegistry{host, recordings};
  LinuxLocaleSettings localeSettings{host, recordings};
  LinuxServiceListener serviceListener{host, codec};
  LinuxNotifications notifications{host};
  LinuxSystemLog systemLog{host, kernel, deviceAnswers};
  LinuxDynamicLoader dynamicLoader{host};
  LinuxMessageDigest messageDigest;
  HostDriverRegistry driverRegistry{host, recordings};
  RecordedStackSnapshot stackSnapshot{recordings};
  RecordedUsageService usageService{recordings};  // last: it ends before what its replies use

  Platform services{driverRegistry,
                    preferences,
                    deviceAnswers,
                    logSubmission,
                    analyticsClient,
                    analyticsHistory,
                    codec,
                    stackSnapshot,
                    usageService,
                    appRegistry,
                    localeSettings,
                    serviceListener,
                    notifications,
                    systemLog,
                    kernel,
                    fileSystem,
                    dynamicLoader,
                    messageDigest,
                    standardDiagnostics(),
                    runLock,
                    analyticsHome};
};

LinuxPlatform::LinuxPlatform(Host host) : families_(std::make_unique<Families>(std::move(host))) {}
LinuxPlatform::~LinuxPlatform() = default;

const Host& LinuxPlatform::host() const {
  return families_->host;
}
Platform& LinuxPlatform::services() {
  return families_->services;
}

}  // namespace tbdaily

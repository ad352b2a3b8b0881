// The host layer keeps the contracts of the families.
#include <gtest/gtest.h>

#include "platform/linux/linux_notifications.h"
#include "platform/linux/linux_preferences.h"
#include "platform/linux/linux_service_listener.h"
#include "platform/linux/test_host.h"
#include "platform/linux/unix_socket.h"
#include "platform/system_log.h"
#include "testing/absent_services_contract.h"
#include "testing/service_contracts.h"

namespace tbdaily::testing {
namespace {

PlistArray textsOf(const std::vector<std::string>& list) {
  PlistArray array;
  for (const std::string& text : list) array.push_back(PlistValue::string(text));
  return array;
}

struct LinuxPreferencesSubject : TestPlatform {
  PreferencesStore& service() { return services.preferences; }
  PreferencesStore& another() { return other; }
  LinuxPreferences other{host, codec};
};
struct LinuxDeviceAnswersSubject : TestPlatform {
  DeviceAnswers& service() { return services.deviceAnswers; }
  void answer(const char* key, const PlistValue& value) { record(recording::kAnswers, key, value); }
  void setBuild(const char* build) { answer("ProductBuildVersion", PlistValue::string(build)); }
  void setMultiUser(bool multiUser) { answer("MultiUser", PlistValue::boolean(multiUser)); }
  void addContainer(const char* identifier, const char* path) {
    answer("GroupContainers", PlistValue::dictionary({{identifier, PlistValue::string(path)}}));
  }
};
struct LinuxKernelSubject : TestPlatform {
  Kernel& service() { return services.kernel; }
  void setSysctl(const char* name, const PlistData& data) {
    record(recording::kKernel, "sysctl", PlistValue::dictionary({{name, PlistValue::data(data)}}));
  }
  void setClock(PlistDate now, std::int64_t ticks, Timebase ratio) {
    record(recording::kClock, "now", PlistValue(now));
    record(recording::kClock, "ticks", PlistValue::int64(ticks));
    record(recording::kClock, "numerator", PlistValue::int64(ratio.numerator));
    record(recording::kClock, "denominator", PlistValue::int64(ratio.denominator));
  }
};
struct LinuxLogSubmissionSubject : TestPlatform {
  static constexpr const char* kPending = "/var/mobile/Library/Logs/Pending";
  LogSubmission& service() { return services.logSubmission; }
  void enable(const PlistValue& value) {
    services.preferences.setValue("DiagnosticLogSubmissionEnabled", value, "com.velmora.Crashferry");
  }
  void setTaskingValue(const char* key, const PlistValue& value) {
    services.preferences.setValue(key, value, "com.velmora.da");
  }
  std::vector<std::string> logs() {
    std::vector<std::string> all;
    for (const std::string& name : names(kPending)) {
      if (name.ends_with(".193")) all.push_back(text(std::string(kPending) + "/" + name));
    }
    return all;
  }
  PlistValue options() {
    return parse(text(std::string(kPending) + "/" + names(kPending).back())).asDictionary()->get("options");
  }
};
struct LinuxAppRegistrySubject : TestPlatform {
  AppRegistry& service() { return services.appRegistry; }
  void addBundle(const std::string& type) {
    bundles.push_back(PlistValue::dictionary({{"type", PlistValue::string(type)}}));
    record(recording::kApps, "bundles", PlistValue::array(bundles));
  }
  PlistArray bundles;
};
struct LinuxLocaleSettingsSubject : TestPlatform {
  LocaleSettings& service() { return services.localeSettings; }
  void set(const std::vector<std::string>& preferred, const std::vector<std::string>& system,
           const char* country) {
    record(recording::kLocale, "preferredLanguages", PlistValue::array(textsOf(preferred)));
    record(recording::kLocale, "systemLanguages", PlistValue::array(textsOf(system)));
    record(recording::kLocale, "countryCode", PlistValue::string(country));
  }
};
struct LinuxNotificationsSubject : TestPlatform {
  Notifications& service() { return services.notifications; }
  std::uint64_t posts(const char* name) { return LinuxNotifications(host).postCount(name); }
};
struct LinuxServiceListenerSubject : TestPlatform {
  ServiceListener& service() { return services.serviceListener; }
  void connectPeer() { peer = connectUnixSocket(endpointPath(host, "com.example.endpoint")).socket; }
  void send(const PlistDictionary& message) {
    const std::string list = codec.write(PlistValue::dictionary(message)).bytes;
    const std::string length{static_cast<char>(list.size() & 0xFF), static_cast<char>(list.size() >> 8), 0,
                             0};
    EXPECT_EQ(writeAll(peer.get(), length + list), 0);
  }
  FileDescriptor peer;
};
struct LinuxFileSystemSubject : TestPlatform {
  FileSystem& service() { return services.fileSystem; }
};
struct LinuxDynamicLoaderSubject : TestPlatform {
  LinuxDynamicLoaderSubject() {
    std::filesystem::create_directory(host.devicePath("/lib"));
    std::filesystem::copy_file(SUPPORT_LIBRARY, host.devicePath(library()));
  }
  DynamicLoader& service() { return services.dynamicLoader; }
  std::string library() { return "/lib/Support"; }
  std::string symbolName() { return "SMXPreferencesGetIntegerValue"; }
};
struct LinuxMessageDigestSubject : TestPlatform {
  MessageDigest& service() { return services.messageDigest; }
};
struct EmptyRootSubject : TestPlatform {
  Platform& service() { return services; }
};
struct MissingRootSubject : EmptyRootSubject {
  MissingRootSubject() { std::filesystem::remove_all(host.root()); }
};
using AbsentSubjects = ::testing::Types<EmptyRootSubject, MissingRootSubject>;

INSTANTIATE_TYPED_TEST_SUITE_P(Linux, PreferencesContract, LinuxPreferencesSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, DeviceAnswersContract, LinuxDeviceAnswersSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, KernelContract, LinuxKernelSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, LogSubmissionContract, LinuxLogSubmissionSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, AppRegistryContract, LinuxAppRegistrySubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, LocaleSettingsContract, LinuxLocaleSettingsSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, NotificationsContract, LinuxNotificationsSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, ServiceListenerContract, LinuxServiceListenerSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, FileSystemContract, LinuxFileSystemSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, DynamicLoaderContract, LinuxDynamicLoaderSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, MessageDigestContract, LinuxMessageDigestSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, AbsentServicesContract, AbsentSubjects);

TEST(MissingRootTest, TakesNoWritesAndIsNotMade) {
  MissingRootSubject subject;
  Platform& host = subject.service();
  host.preferences.setValue("k", PlistValue::int64(1), "d");
  host.preferences.synchronize("d");
  host.analyticsClient.setValueForScalarKey("k", 1);
  host.analyticsClient.checkpoint();
  EXPECT_FALSE(host.logSubmission.writeLogForSubmission("1", "n", {}, {}, [](LogOutput&) { return true; }));
  host.logSubmission.logStructuredData(172, {});
  host.logSubmission.dumpAllOldStructuredDataLogs();
  host.logSubmission.rollCarewellLogs();
  host.logSubmission.submitDiagnosticLogs();
  host.notifications.post("n");
  host.systemLog.writePlain("line");
  EXPECT_EQ(host.serviceListener.createListener("e", DeliveryQueue::Main), 0U);
  EXPECT_FALSE(std::filesystem::exists(subject.host.root()));
}

}  // namespace
}  // namespace tbdaily::testing

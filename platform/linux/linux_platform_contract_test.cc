// The host layer keeps the contracts of the families.
#include <gtest/gtest.h>

#include "platform/byte_writer.h"
#include "platform/linux/host_test_support.h"
#include "platform/linux/linux_notifications.h"
#include "platform/linux/linux_preferences.h"
#include "platform/linux/linux_service_listener.h"
#include "platform/linux/unix_socket.h"
#include "platform/system_log.h"
#include "testing/absent_services_contract.h"
#include "testing/service_contracts.h"

namespace tbdaily::testing {
namespace {

class LinuxSubject : public TestPlatform {
 public:
  LinuxSubject() {
    std::filesystem::create_directory(host.files().place("/lib"));
    std::filesystem::copy_file(SUPPORT_LIBRARY, host.files().place(library()));
  }

  PreferencesStore& anotherStore() { return other_; }
  void answer(const char* key, const PlistValue& value) { record(recording::kAnswers, key, value); }
  void addContainer(const char* identifier, const char* path) {
    answer("GroupContainers", PlistValue::dictionary({{identifier, PlistValue::string(path)}}));
  }
  void setSysctl(const char* name, const PlistData& data) {
    record(recording::kKernel, "sysctl", PlistValue::dictionary({{name, PlistValue::data(data)}}));
  }
  void setTime(PlistDate now, std::int64_t ticks, Timebase ratio) {
    setClock(now.unixSeconds());
    record(recording::kClock, "ticks", PlistValue::int64(ticks));
    record(recording::kClock, "numerator", PlistValue::int64(ratio.numerator));
    record(recording::kClock, "denominator", PlistValue::int64(ratio.denominator));
  }
  void enableLogs(const PlistValue& value) {
    services.preferences.setValue("DiagnosticLogSubmissionEnabled", value, "com.velmora.Crashferry");
  }
  void setTaskingValue(const char* key, const PlistValue& value) {
    services.preferences.setValue(key, value, "com.velmora.da");
  }
  std::vector<std::string> logs() {
    std::vector<std::string> all;
    for (const std::string& name : names(kPending)) {
      if (name.ends_with(".193")) all.push_back(text(std::string(kPending) + name));
    }
    return all;
  }
  PlistValue logOptions() {
    return parse(text(std::string(kPending) + names(kPending).back())).asDictionary()->get("options");
  }
  void addBundle(const std::string& type) {
    bundles_.push_back(PlistValue::dictionary({{"type", PlistValue::string(type)}}));
    record(recording::kApps, "bundles", PlistValue::array(bundles_));
  }
  std::uint64_t posts(const char* name) { return LinuxNotifications(host).postCount(name); }
  void connectPeer() {
    peer_ = connectUnixSocket(openFolder(kEndpointFolder), "com.example.endpoint.sock").socket;
  }
  void send(const PlistDictionary& message) {
    const std::string list = codec.write(PlistValue::dictionary(message)).bytes;
    std::string bytes;
    appendLittleEndian(bytes, list.size(), 4);
    EXPECT_EQ(writeAll(peer_.get(), bytes + list), 0);
  }
  void setDrivers(const std::vector<ScriptedDriver>& drivers) {
    PlistArray entries;
    for (const ScriptedDriver& driver : drivers) {
      PlistDictionary entry{{"class", PlistValue::string(driver.serviceClass)},
                            {"properties", PlistValue::dictionary(driver.properties)},
                            {"retainCount", PlistValue::int64(driver.retainCount)},
                            {"parent", PlistValue::int64(static_cast<std::int64_t>(*driver.parent))}};
      if (driver.identifier)
        entry.set("id", PlistValue::int64(static_cast<std::int64_t>(*driver.identifier)));
      if (driver.name) entry.set("name", PlistValue::string(*driver.name));
      entries.push_back(PlistValue::dictionary(entry));
    }
    record(recording::kRegistry, "entries", PlistValue::array(entries));
  }
  std::string library() { return "/lib/Support"; }
  std::string symbolName() { return "SMXPreferencesGetIntegerValue"; }

 private:
  static constexpr const char* kPending = "/var/mobile/Library/Logs/Pending/";
  LinuxPreferences other_{host, codec};
  PlistArray bundles_;
  FileDescriptor peer_;
};

struct MissingRoot : TestPlatform {
  MissingRoot() { std::filesystem::remove_all(host.root()); }
};
using AbsentSubjects = ::testing::Types<TestPlatform, MissingRoot>;

INSTANTIATE_TYPED_TEST_SUITE_P(Linux, ServiceContract, LinuxSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, ComputationContract, TestPlatform);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, AbsentServicesContract, AbsentSubjects);

TEST(MissingRootTest, TakesNoWritesAndIsNotMade) {
  MissingRoot subject;
  Platform& host = subject.services;
  host.preferences.setValue("k", PlistValue::int64(1), "d");
  host.analyticsClient.setValueForScalarKey("k", 1);
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

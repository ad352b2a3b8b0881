// The fakes keep the contracts of the families that they stand in for.
#include "testing/absent_services_contract.h"
#include "testing/analytics_contract.h"
#include "testing/service_contracts.h"

namespace tbdaily::testing {
namespace {

struct FakeSubject : FakePlatform {
  FakeSubject() {
    dynamicLoader.library = library();
    dynamicLoader.symbols[symbolName()] = this;
  }
  ~FakeSubject() { EXPECT_EQ(driverRegistry.openHandles(), 0U); }
  Platform& services = platform;

  PreferencesStore& anotherStore() { return preferences; }
  void answer(const char* key, const PlistValue& value) { deviceAnswers.answers.set(key, value); }
  void addContainer(const char* id, const char* path) { deviceAnswers.containers[id] = path; }
  void setSysctl(const char* name, const PlistData& data) { kernel.sysctls[name] = data; }
  void setTime(PlistDate now, std::uint64_t ticks, Timebase ratio) {
    kernel.now = now;
    kernel.ticks = ticks;
    kernel.ratio = ratio;
  }
  void enableLogs(const PlistValue& value) { logSubmission.enabled = value.asBoolean().value_or(false); }
  void setTaskingValue(const char* key, const PlistValue& value) {
    logSubmission.taskingValues.set(key, value);
  }
  PlistValue logOptions() { return logSubmission.logs.back().options; }
  std::vector<std::string> logs() {
    std::vector<std::string> all;
    for (const auto& log : logSubmission.logs) all.push_back(log.bytes);
    return all;
  }
  void addBundle(const std::string& type) { appRegistry.bundleTypes.push_back(type); }
  std::size_t posts(const char* name) {
    return static_cast<std::size_t>(std::ranges::count(notifications.posts, name));
  }
  void connectPeer() { serviceListener.addPeer(kPeer); }
  void send(const PlistDictionary& message) { serviceListener.addMessage(kPeer, message); }
  void setDrivers(std::vector<ScriptedDriver> drivers) { driverRegistry.drivers = std::move(drivers); }
  void put(const char* path, const std::string& contents) { fileSystem.files[path] = bytesOf(contents); }
  std::string library() { return "/lib/Support"; }
  std::string symbolName() { return "function"; }

  // Of AnalyticsContract.
  void addScalar(std::string_view key, DayNumber day, std::int64_t value) {
    analyticsHistory.addScalar(key, day, value);
  }
  void addDistribution(std::string_view key, DayNumber day, const std::vector<double>& values) {
    analyticsHistory.addDistribution(key, day, values);
  }

 private:
  static constexpr ServiceConnection kPeer = 2;
};

INSTANTIATE_TYPED_TEST_SUITE_P(Fake, ServiceContract, FakeSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, AnalyticsContract, FakeSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, AbsentServicesContract, FakeSubject);

}  // namespace
}  // namespace tbdaily::testing

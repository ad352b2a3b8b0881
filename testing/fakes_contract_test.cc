// The fakes keep the contracts of the families that they stand in for.
#include "testing/absent_services_contract.h"
#include "testing/analytics_contract.h"
#include "testing/fake_platform.h"
#include "testing/property_list_codec_contract.h"
#include "testing/service_contracts.h"

namespace tbdaily::testing {
namespace {

// One family of a platform of fakes.
template <auto Member>
struct Fake {
  FakePlatform platform;
  auto& service() { return platform.*Member; }
};

struct FakePreferencesSubject : Fake<&FakePlatform::preferences> {
  PreferencesStore& another() { return service(); }
};
struct FakeDeviceAnswersSubject : Fake<&FakePlatform::deviceAnswers> {
  void answer(const char* key, const PlistValue& value) { service().answers.set(key, value); }
  void setBuild(const char* build) { service().build = build; }
  void setMultiUser(bool multiUser) { service().multiUser = multiUser; }
  void addContainer(const char* identifier, const char* path) { service().containers[identifier] = path; }
};
struct FakeKernelSubject : Fake<&FakePlatform::kernel> {
  void setSysctl(const char* name, const PlistData& data) { service().sysctls[name] = data; }
  void setClock(PlistDate now, std::uint64_t ticks, Timebase ratio) {
    service().now = now;
    service().ticks = ticks;
    service().ratio = ratio;
  }
};
struct FakeLogSubmissionSubject : Fake<&FakePlatform::logSubmission> {
  void enable(const PlistValue& value) { service().enabled = value.asBoolean().value_or(false); }
  void setTaskingValue(const char* key, const PlistValue& value) { service().taskingValues.set(key, value); }
  PlistValue options() { return service().logs.back().options; }
  std::vector<std::string> logs() {
    std::vector<std::string> all;
    for (const auto& log : service().logs) all.push_back(log.bytes);
    return all;
  }
};
struct FakeAppRegistrySubject : Fake<&FakePlatform::appRegistry> {
  void addBundle(const std::string& type) { service().bundleTypes.push_back(type); }
};
struct FakeLocaleSettingsSubject : Fake<&FakePlatform::localeSettings> {
  void set(const std::vector<std::string>& preferred, const std::vector<std::string>& system,
           const char* country) {
    service().preferred = preferred;
    service().system = system;
    service().country = country;
  }
};
struct FakeNotificationsSubject : Fake<&FakePlatform::notifications> {
  std::size_t posts(const char* name) {
    return static_cast<std::size_t>(std::ranges::count(service().posts, name));
  }
};
struct FakeServiceListenerSubject : Fake<&FakePlatform::serviceListener> {
  static constexpr ServiceConnection kPeer = 2;
  void connectPeer() { service().addPeer(kPeer); }
  void send(const PlistDictionary& message) { service().addMessage(kPeer, message); }
};
struct FakeFileSystemSubject : Fake<&FakePlatform::fileSystem> {
  void put(const char* path, const std::string& contents) { service().files[path] = bytesOf(contents); }
};
struct FakeDynamicLoaderSubject : Fake<&FakePlatform::dynamicLoader> {
  FakeDynamicLoaderSubject() {
    service().library = library();
    service().symbols[symbolName()] = this;
  }
  std::string library() { return "/library"; }
  std::string symbolName() { return "function"; }
};
struct FakeHistorySubject : Fake<&FakePlatform::analyticsHistory> {
  void addScalar(std::string_view key, DayNumber day, std::int64_t value) {
    service().addScalar(key, day, value);
  }
  void addDistribution(std::string_view key, DayNumber day, const std::vector<double>& values) {
    service().addDistribution(key, day, values);
  }
};
struct FakeClientSubject : Fake<&FakePlatform::analyticsClient> {
  void setToday(PlistDate now) { service().today = dayNumberOf(now); }
  std::optional<std::int64_t> scalar(std::string_view key, DayNumber day) {
    return service().scalar(key, day);
  }
};

INSTANTIATE_TYPED_TEST_SUITE_P(Fake, PreferencesContract, FakePreferencesSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, DeviceAnswersContract, FakeDeviceAnswersSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, KernelContract, FakeKernelSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, LogSubmissionContract, FakeLogSubmissionSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, AppRegistryContract, FakeAppRegistrySubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, LocaleSettingsContract, FakeLocaleSettingsSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, NotificationsContract, FakeNotificationsSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, ServiceListenerContract, FakeServiceListenerSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, FileSystemContract, FakeFileSystemSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, DynamicLoaderContract, FakeDynamicLoaderSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, MessageDigestContract, Fake<&FakePlatform::messageDigest>);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, PropertyListCodecContract, Fake<&FakePlatform::propertyListCodec>);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, AnalyticsHistoryContract, FakeHistorySubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, AnalyticsClientContract, FakeClientSubject);
INSTANTIATE_TYPED_TEST_SUITE_P(Fake, AbsentServicesContract, Fake<&FakePlatform::platform>);

TEST(FakeDriverRegistryTest, FindsDriversAndCountsWhatStaysOpen) {
  FakeDriverRegistry registry;
  const PlistDictionary isPublic{{"p", PlistValue::boolean(true)}};
  registry.drivers = {{1, "parent", "C", {{"q", PlistValue::int64(7)}}, 3},  // in a circle
                      {2, "child", "D", isPublic, 1},
                      {3, "other", "C", isPublic, 4711}};
  registry.structMethod = [](const FakeDriver& driver, std::uint32_t, auto, auto output, std::size_t& size) {
    output[0] = static_cast<std::byte>(*driver.identifier);
    size = 1;
    return kKdSuccess;
  };
  KdHandle iterator = 0, connection = 0;
  const PlistValue description =
      PlistValue::dictionary({{"KdPropertyMatch", PlistValue::dictionary(isPublic)}});
  ASSERT_EQ(registry.KdServiceGetMatchingServices(description, iterator), kKdSuccess);
  const KdHandle child = registry.KdIteratorNext(iterator), other = registry.KdIteratorNext(iterator);
  EXPECT_EQ(registry.KdIteratorNext(iterator), 0U);
  const auto search = [&](const char* key) {
    return registry.KdRegistryEntrySearchCFProperty(child, KdRegistryPlane::KdService, key,
                                                    KdSearchOptions::RecursivelyTowardsParents);
  };
  EXPECT_EQ(search("q"), PlistValue::int64(7));
  EXPECT_TRUE(search("none").isNone());
  ASSERT_EQ(registry.KdServiceOpen(other, 0, connection), kKdSuccess);
  PlistData output(4);
  std::size_t size = output.size();
  EXPECT_EQ(registry.KdConnectCallStructMethod(connection, 5, {}, output, size), kKdSuccess);
  EXPECT_TRUE(size == 1 && output[0] == std::byte{3});
  EXPECT_EQ(registry.openHandles(), 4U);
  EXPECT_EQ(registry.KdServiceClose(connection), kKdSuccess);
  EXPECT_NE(registry.KdServiceClose(connection), kKdSuccess);
  for (const KdHandle object : {iterator, child, other})
    EXPECT_EQ(registry.KdObjectRelease(object), kKdSuccess);
  EXPECT_EQ(registry.openHandles(), 0U);
  const KdHandle first = registry.KdServiceGetMatchingService(registry.KdServiceMatching("C"));
  std::uint64_t identifier = 0;
  EXPECT_TRUE(registry.KdRegistryEntryGetRegistryEntryID(first, identifier) == kKdSuccess && identifier == 1);
}

}  // namespace
}  // namespace tbdaily::testing

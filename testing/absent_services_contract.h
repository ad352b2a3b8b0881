// What every family of a host that has nothing answers. The subject is default-constructible and has
// `Platform& services`.
#pragma once

#include <chrono>
#include <thread>

#include "testing/analytics_lines.h"
#include "testing/contract_test.h"

namespace tbdaily::testing {

template <typename Subject>
struct AbsentServicesContract : ContractTest<Subject> {};
TYPED_TEST_SUITE_P(AbsentServicesContract);

TYPED_TEST_P(AbsentServicesContract, AnswersNothing) {
  Platform& host = this->services;
  DeviceAnswers& answers = host.deviceAnswers;
  EXPECT_TRUE(host.preferences.getValue("k", "d").isNone() && answers.copyAnswer("DiskUsage").isNone());
  EXPECT_FALSE(answers.booleanAnswer("InternalBuild") || answers.currentOSBuildVersion() ||
               answers.multiUserMode() || answers.systemGroupContainerPath("g").path);
  LogSubmission& logs = host.logSubmission;
  EXPECT_FALSE(logs.isDiagnosticLogSubmissionEnabled());
  EXPECT_TRUE(logs.taskingValue("k").isNone());
  EXPECT_EQ(logs.currentOSVersion() + logs.systemIdentifier() + logs.hardwareModel() + logs.systemVersion(),
            "");
  EXPECT_EQ(scalarLines(*host.analyticsHistory.open()), Lines{});
  EXPECT_EQ(distributionLines(*host.analyticsHistory.open()), Lines{});
  host.appRegistry.enumerateBundles(BundleKind::Application, [](std::string_view) { ADD_FAILURE(); });
  EXPECT_TRUE(host.localeSettings.preferredLanguages().empty() &&
              host.localeSettings.systemLanguages().empty());
  EXPECT_FALSE(host.localeSettings.countryCode());
  EXPECT_EQ(host.serviceListener.runSlice(0.01), SliceResult::TimedOut);
  PlistData buffer(8);
  std::size_t length = buffer.size();
  EXPECT_EQ(host.kernel.sysctlByName("vm.swapusage", buffer, length), 2);
  EXPECT_EQ(host.kernel.sysctlByName("kern.next_ecc_event", buffer, length), 2);
  EXPECT_TRUE(host.kernel.tickCount() == 0 && !host.kernel.timebase() &&
              host.kernel.currentTime().unixSeconds() == 0);
  EXPECT_FALSE(host.fileSystem.status("/file") || host.fileSystem.readFile("/file"));
  EXPECT_EQ(host.dynamicLoader.open("/library"), nullptr);
  const auto configuration = host.stackSnapshot.createConfiguration();
  EXPECT_TRUE(configuration == nullptr || configuration->capture() != kKdSuccess);
  const auto workspace = host.usageService.createWorkspace();
  const auto feed = workspace != nullptr ? workspace->createFeed() : nullptr;
  if (feed != nullptr) {
    feed->requestUsageToDate({}, UsageNameKind::ProcessName, [](const PlistValue&) { ADD_FAILURE(); });
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
  }

  DriverRegistry& registry = host.driverRegistry;
  EXPECT_TRUE(registry.KdServiceMatching("STXStorage").isNone());
  const PlistValue matching = PlistValue::dictionary({{"KdPropertyMatch", PlistValue::dictionary({})}});
  EXPECT_EQ(registry.KdServiceGetMatchingService(matching), 0U);
  KdHandle iterator = 0, connection = 1;
  registry.KdServiceGetMatchingServices(matching, iterator);
  EXPECT_EQ(registry.KdIteratorNext(iterator), 0U);
  EXPECT_EQ(registry.KdObjectGetUserRetainCount(1), 0U);
  EXPECT_TRUE(registry.KdRegistryEntryCreateCFProperty(1, "k").isNone());
  std::uint64_t identifier = 0;
  std::string name;
  std::span<std::byte> memory;
  KdMethodOutput output;
  for (const KdStatus status :
       {registry.KdRegistryEntryGetRegistryEntryID(1, identifier), registry.KdRegistryEntryGetName(1, name),
        registry.KdServiceOpen(1, 0, connection), registry.KdServiceClose(1), registry.KdObjectRelease(1),
        registry.KdConnectCallStructMethod(1, 5, {}, {}, length),
        registry.KdConnectCallScalarMethod(1, 0, {}, {}, length),
        registry.KdConnectCallMethod(1, 2, {}, output), registry.KdConnectMapMemory(1, 0, memory)}) {
    EXPECT_NE(status, kKdSuccess);
  }
  EXPECT_EQ(connection, 0U);
}
REGISTER_TYPED_TEST_SUITE_P(AbsentServicesContract, AnswersNothing);

}  // namespace tbdaily::testing

#include <gmock/gmock.h>

#include <random>

#include "drivermetrics/metrics_test_support.h"
#include "drivermetrics/subscription.h"
#include "platform/byte_reader.h"
#include "platform/byte_writer.h"

namespace kdreport {
namespace {

using testing::channelOf, testing::channelsIn, testing::channelType, testing::collectionOf;
using ::testing::ElementsAre;

class DeviceWithHub {
 public:
  ~DeviceWithHub() { expectNothingHeld(); }
  void expectNothingHeld() const {
    EXPECT_EQ(registry.openHandles(), 0U);
    EXPECT_EQ(registry.mappings, 0);
  }

  // The reason and code of a subscription that fails.
  std::string failure(const KdReportCollection& channels, std::pmr::memory_resource* allocator = nullptr) {
    std::optional<ReportError> error;
    KdReportCollection subscribed;
    EXPECT_EQ(KdReportCreateSubscription(registry, allocator, channels.get(), &subscribed, 0, &error),
              nullptr);
    EXPECT_EQ(subscribed, nullptr);
    expectNothingHeld();
    return error ? error->reason + " " + std::to_string(error->code) : "no error";
  }

  testing::FakeDriverRegistry registry;
  testing::ScriptedHub hub{registry};
};

TEST(Subscription, TellsTheHubWhatIsWantedAndSamplesItsBuffer) {
  DeviceWithHub device;
  const ChannelType type = channelType(1, 1, 0x100);
  testing::appendElement(device.hub.buffer, 5, 6, type, {.stamp = 1, .words = {100}});
  const KdReportCollection channels = collectionOf({channelOf(5, 6, type), channelOf(5, 7, ChannelType{})});
  KdReportCollection subscribed;
  {
    const auto subscription =
        KdReportCreateSubscription(device.registry, nullptr, channels.get(), &subscribed, 0);
    ASSERT_NE(subscription, nullptr);
    PlistData expected;
    for (const std::uint64_t word : {std::uint64_t{2}, std::uint64_t{5}, std::uint64_t{6}, type.bits,
                                     std::uint64_t{5}, std::uint64_t{7}, std::uint64_t{0}})
      tbdaily::appendLittleEndian(expected, word);
    EXPECT_EQ(device.hub.interestList, expected);

    const KdReportCollection before = KdReportCreateSamples(subscription.get(), subscribed.get());
    device.hub.buffer[32] = std::byte{250};
    const KdReportCollection after = KdReportCreateSamples(subscription.get(), subscribed.get());
    const KdReportCollection delta = KdReportCreateSamplesDelta(before.get(), after.get());
    EXPECT_EQ(KdReportSimpleGetIntegerValue(channelsIn(before.get())[0]), 100);
    EXPECT_EQ(KdReportSimpleGetIntegerValue(channelsIn(delta.get())[0]), 150);
    EXPECT_EQ(channelsIn(delta.get()).size(), 1U) << "a channel that the buffer lacks is left out";

    std::optional<ReportError> error;
    device.hub.updateStatus = 77;
    EXPECT_EQ(KdReportCreateSamples(subscription.get(), subscribed.get(), &error), nullptr);
    EXPECT_EQ(error->code, 77);
    EXPECT_EQ(KdReportCreateSamples(nullptr, subscribed.get(), &error), nullptr);
    EXPECT_EQ(error->code, kKdBadArgument);
    EXPECT_EQ(device.registry.mappings, 1);
  }
  device.expectNothingHeld();

  device.hub.buffer = PlistData();  // mapped as well, without an address
  EXPECT_NE(KdReportCreateSubscription(device.registry, nullptr, channels.get(), &subscribed, 0), nullptr);
  device.expectNothingHeld();
}

TEST(Subscription, LeavesNothingBehindWhenAStepFails) {
  const std::string noReason = "createPVErr() passed a NULL string! ";
  const auto code = [](KdStatus status) { return std::to_string(status); };
  const KdReportCollection good = collectionOf({channelOf(5, 6)});
  DeviceWithHub device;
  EXPECT_EQ(device.failure(nullptr), "bad arguments " + code(kKdBadArgument));
  EXPECT_EQ(device.failure(KdReportCreateAggregate(0)), "no channels " + code(kKdBadArgument));
  const KdReportCollection odd = KdReportCreateAggregateFromPropertyList(
      PlistValue::dictionary({{"KdReportChannels", PlistValue::array({PlistValue::int64(1)})}}));
  EXPECT_EQ(device.failure(odd), "iteration error " + code(kKdBadArgument));
  EXPECT_EQ(device.failure(collectionOf({testing::emptyChannel()})),
            "createInterestList() failed " + code(kKdNoMemory));
  EXPECT_EQ(device.failure(good, std::pmr::null_memory_resource()), noReason + code(kKdNoMemory));
  const std::vector<std::tuple<KdStatus&, KdStatus, std::string>> steps = {
      {device.registry.openStatus, kKdError, "Could not open KdReportHub"},
      {device.hub.userClientOpenStatus, 12, "kKdReportUserClientOpen failed"},
      {device.hub.configureStatus, -3, "kKdReportUserClientConfigureInterests failed"},
      {device.hub.mapStatus, 5, "KdConnectMapMemory() failed"},
  };
  for (const auto& [status, failing, reason] : steps) {
    status = failing;
    EXPECT_EQ(device.failure(good), reason + " " + code(failing));
    status = kKdSuccess;
  }
  device.hub.scalars = 0;
  EXPECT_EQ(device.failure(good), "kKdReportUserClientConfigureInterests failed " + code(kKdError));
  device.registry.drivers[0].serviceClass = "Other";
  EXPECT_EQ(device.failure(good), noReason + code(kKdNotFound));
  device.registry.drivers.clear();
  EXPECT_EQ(device.failure(good), noReason + code(kKdNoMemory));

  EXPECT_EQ(interestListSize(89478477), 2147483456U);
  EXPECT_EQ(interestListSize(89478478), std::nullopt);
  EXPECT_EQ(createInterestList(good.get(), 2), std::nullopt);
}

// The outcome of a raw sampling: the channels' identifiers with the number of their elements, or the failure.
std::string sample(const KdReportCollection& channels, const PlistData& buffer) {
  std::optional<ReportError> error;
  const KdReportCollection samples = KdReportCreateSamplesRaw(channels.get(), buffer, &error);
  if (samples == nullptr) return error->reason.substr(0, 10) + std::to_string(error->code);
  std::string outcome;
  for (const ChannelRecord* channel : channelsIn(samples.get())) {
    outcome += std::to_string(KdReportChannelGetChannelID(channel)) + ":";
    outcome += std::to_string(channel->elements().size() / kElementSize) + " ";
  }
  return outcome;
}

TEST(Samples, ReadBuffersAsASearchFromTheirStartWould) {
  std::mt19937 random(6);
  const auto below = [&random](unsigned n) { return static_cast<unsigned>(random() % n); };
  const KdReportCollection channels =
      collectionOf({channelOf(1, 0), channelOf(1, 1), channelOf(1, 2), channelOf(1, 3)});
  for (unsigned round = 0; round < 3000; ++round) {
    PlistData buffer;
    for (unsigned i = below(6); i > 0; --i) {
      const unsigned count = below(12) == 0 ? 0 : 1 + below(3);
      const unsigned laid = below(10) == 0 ? below(4) : std::max(count, 1U);
      for (unsigned k = 0, id = below(5); k < laid; ++k)
        testing::appendElement(buffer, 1, id, channelType(1, count));
    }
    buffer.resize(buffer.size() + below(3) * below(64));
    // For each channel anew, from the first element on.
    std::string expected;
    KdStatus status = kKdError;
    bool isStopped = false;
    const std::size_t end = buffer.size() / kElementSize * kElementSize;
    for (std::uint64_t id = 0; id < 4 && !isStopped; ++id) {
      std::size_t at = 0, count = 0;
      const tbdaily::ByteReader reader(buffer);
      for (; at < end; at += count * kElementSize) {
        count = *reader.at<std::uint16_t>(at + 20);
        if (count == 0 || *reader.at<std::uint64_t>(at + 8) == id) break;
      }
      const bool isMissing = at == end || (at < end && at + count * kElementSize > end);
      if (isMissing) status = kKdNotFound;
      if (at < end && count == 0) isStopped = true;
      if (!isMissing) expected += std::to_string(id) + ":" + std::to_string(at > end ? 0 : count) + " ";
    }
    if (isStopped) expected = "couldn't c" + std::to_string(status);
    if (end == 0) expected = "createPVEr" + std::to_string(kKdBadArgument);
    ASSERT_EQ(sample(channels, buffer), expected) << "round " << round;
  }
}

}  // namespace
}  // namespace kdreport

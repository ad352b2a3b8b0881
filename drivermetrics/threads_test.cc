#include <gmock/gmock.h>

#include <thread>

#include "drivermetrics/metrics_test_support.h"

namespace kdreport {
namespace {

using testing::channelOf, testing::channelType, testing::collectionOf;

constexpr std::int64_t kChannels = 50, kFirstID = 0x4121;  // "A!"
constexpr int kThreads = 4, kRounds = 20;

KdReportCollection channels(ChannelType type) {
  std::vector<KdReportChannel> all;
  for (std::int64_t i = 0; i < kChannels; ++i) all.push_back(channelOf(1, kFirstID + i, type));
  return collectionOf(all);
}

PlistData bufferOf(ChannelType type) {
  PlistData buffer;
  for (std::int64_t i = 0; i < kChannels; ++i)
    testing::appendElement(buffer, 1, kFirstID + i, type, {.stamp = 1, .words = {0x4F4E, 2, 3, 4}});
  return buffer;
}

template <typename Work>
void inThreads(const Work& work) {
  std::vector<std::jthread> threads;
  for (int i = 0; i < kThreads; ++i) threads.emplace_back(work);
}

// What races shows under the thread sanitizer; what is asserted here is that nobody reads half an answer.
TEST(Threads, SampleClonesOfOneCollectionWhoseTypesAreUnknown) {
  const ChannelType type = channelType(kKdReportState);
  const KdReportCollection untyped = channels(ChannelType{});
  const PlistData buffer = bufferOf(type);
  inThreads([&] {
    const auto keepAll = [](const ChannelRecord&, ChannelRecord&) -> std::uint32_t { return kKdReportKeep; };
    const KdReportCollection clone = cloneAggregate(untyped.get(), keepAll);
    for (int round = 0; round < kRounds; ++round) {
      const KdReportCollection samples = KdReportCreateSamplesRaw(clone.get(), buffer);
      KdReportIterate(samples.get(), [&](ChannelRecord& channel) {
        EXPECT_EQ(KdReportChannelGetFormat(&channel), kKdReportState);
        EXPECT_EQ(KdReportStateGetNameForIndex(&channel, 0), "ON");
        return 0U;
      });
    }
  });
}

TEST(Threads, ReadRecordsThatTwoCollectionsShare) {
  const KdReportCollection filed = channels(channelType(kKdReportState));
  const KdReportCollection sampled =
      KdReportCreateSamplesRaw(filed.get(), bufferOf(channelType(kKdReportState)));
  const KdReportCollection merged = KdReportCreateAggregate(kKdReportFileByDriver);
  ASSERT_EQ(KdReportMergeChannels(merged.get(), sampled.get()), 0U);
  inThreads([&, first = sampled.get(), second = merged.get()] {
    for (const ChannelCollection* collection : {first, second}) {
      char last = '!';
      KdReportIterate(collection, [&](ChannelRecord& channel) {
        const KdReportChannel held = KdReportRetainChannel(channel);
        EXPECT_EQ(KdReportStateGetNameForIndex(&channel, 0), "ON");
        EXPECT_EQ(KdReportChannelGetChannelName(held.get()), (std::string{'A', last++}));
        return 0U;
      });
    }
  });
}

}  // namespace
}  // namespace kdreport

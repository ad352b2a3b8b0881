#include <gmock/gmock.h>

#include <random>
#include <stdexcept>

#include "drivermetrics/metrics_test_support.h"
#include "testing/allocations.h"

namespace kdreport {
namespace {

using testing::channelOf, testing::channelsIn, testing::channelType, testing::collectionOf;
using ::testing::ElementsAre;

constexpr unsigned kRounds = 300;

class RandomChannels {
 public:
  unsigned below(unsigned n) { return static_cast<unsigned>(random_() % n); }

  std::vector<KdReportChannel> make(unsigned most) {
    std::vector<KdReportChannel> channels(below(most + 1));
    for (KdReportChannel& channel : channels) {
      channel = channelOf(1 + below(3), 1 + below(12), channelType(1 + below(2)));
      if (below(3) != 0) testing::groupOf(*channel).groupName = PlistValue::string(below(2) != 0 ? "G" : "H");
      if (below(2) != 0) testing::groupOf(*channel).subGroupName = PlistValue::string("S");
      PlistData bytes;
      testing::appendElement(bytes, 0, 0, channelType(KdReportChannelGetFormat(channel.get())),
                             {.words = {1, 2, 3, 4}});
      channel->copyElements(bytes);
    }
    return channels;
  }

 private:
  std::mt19937 random_{20261124};
};

// Where a filed collection has the channel: driver, group, subgroup, as far as they are there.
std::vector<PlistValue> pathOf(const ChannelRecord& channel) {
  const LegendGroup& group = channel.group();
  std::vector<PlistValue> path{group.driverID};
  if (group.groupName) path.push_back(group.groupName);
  if (group.groupName && group.subGroupName) path.push_back(group.subGroupName);
  return path;
}

// The order of its walk, said once more: what a level holds itself, then each part in the order in which it
// began.
std::vector<ChannelRecord*> inWalkOrder(const std::vector<KdReportChannel>& channels) {
  std::multimap<std::vector<std::ptrdiff_t>, ChannelRecord*>
      keyed;  // equal keys stay in the order of the list
  for (const KdReportChannel& channel : channels) {
    const auto path = pathOf(*channel);
    std::vector<std::ptrdiff_t> key;
    for (auto end = path.begin() + 1; key.size() < path.size(); ++end) {
      const std::span place(path.begin(), end);
      const auto begins = [&](const KdReportChannel& other) {
        return std::ranges::mismatch(place, pathOf(*other)).in1 == place.end();
      };
      key.push_back(std::ranges::find_if(channels, begins) - channels.begin());
    }
    keyed.emplace(key, channel.get());
  }
  std::vector<ChannelRecord*> ordered;
  for (const auto& [key, channel] : keyed) ordered.push_back(channel);
  return ordered;
}

TEST(CollectionWalk, VisitsClonesAndPrunesLikeAList) {
  RandomChannels random;
  for (unsigned round = 0; round < kRounds; ++round) {
    const auto channels = random.make(20);
    const KdReportCollection filed = collectionOf(channels, 3);
    std::vector<ChannelRecord*> expected = inWalkOrder(channels);
    EXPECT_EQ(channelsIn(filed.get()), expected);
    EXPECT_EQ(KdReportGetChannelCount(filed.get()), channels.size());

    const unsigned modulus = 2 + random.below(4);
    const auto answer = [modulus](const ChannelRecord& channel) -> std::uint32_t {
      return static_cast<unsigned>(KdReportChannelGetChannelID(&channel)) % modulus == 0 ? kKdReportRemove
                                                                                         : kKdReportKeep;
    };
    const KdReportCollection copy = cloneAggregate(
        filed.get(), [&](const ChannelRecord& channel, ChannelRecord&) { return answer(channel); });
    const std::size_t removed = std::erase_if(
        expected, [&](const ChannelRecord* channel) { return answer(*channel) != kKdReportKeep; });
    std::vector<ChannelRecord*> copies = channelsIn(copy.get());
    ASSERT_EQ(copies.size(), expected.size());
    for (std::size_t i = 0; i < copies.size(); ++i) {
      EXPECT_NE(copies[i], expected[i]);
      EXPECT_EQ(copies[i]->source, expected[i]->source);
      EXPECT_EQ(copies[i]->elements().data(), expected[i]->elements().data());
    }
    EXPECT_TRUE(copy->queryOptions.isNone());

    EXPECT_EQ(KdReportPrune(filed.get(), answer), removed != 0 ? kKdReportRemove : kKdReportKeep);
    EXPECT_EQ(channelsIn(filed.get()), expected);
    KdReportPrune(filed.get(), [](ChannelRecord&) -> std::uint32_t { return kKdReportRemove; });
    EXPECT_TRUE(filed->channels.isAbsent() && filed->drivers.isAbsent() && filed->channelGroups.isAbsent());
    EXPECT_EQ(_getAggregateOpts(filed.get()), 3U);
  }
}

TEST(CollectionWalk, KeepsAliveWhatItsChannelsReferTo) {
  const ChannelType type = channelType(kKdReportSimple);
  std::vector<KdReportChannel> channels;
  PlistData buffer;
  for (std::int64_t i = 0; i < 600; ++i) {  // several blocks
    channels.push_back(channelOf(1 + i % 3, i, type));
    testing::appendElement(buffer, 1 + i % 3, i, type, {.words = {i}});
  }
  KdReportCollection copy;
  {
    const KdReportCollection samples = KdReportCreateSamplesRaw(collectionOf(channels).get(), buffer);
    (void)KdReportChannelGetChannelName(channelsIn(samples.get())[0x41]);
    copy = cloneAggregate(samples.get(), [](const ChannelRecord&, ChannelRecord&) { return 0U; });
  }
  channels.clear();
  EXPECT_EQ(KdReportPrune(copy.get(),
                          [](ChannelRecord& channel) -> std::uint32_t {
                            const std::int64_t id = KdReportChannelGetChannelID(&channel);
                            return id == 0x41 || id == 599 ? kKdReportKeep : kKdReportRemove;
                          }),
            kKdReportRemove);
  const KdReportChannel first = KdReportRetainChannel(*channelsIn(copy.get())[0]);
  EXPECT_EQ(KdReportSimpleGetIntegerValue(channelsIn(copy.get())[1]), 599);
  copy = nullptr;
  EXPECT_EQ(KdReportSimpleGetIntegerValue(first.get()), 0x41);
  EXPECT_EQ(KdReportChannelGetChannelName(first.get()), "A");
  EXPECT_EQ(KdReportChannelGetDriverName(first.get()), "D3");
}

TEST(CollectionWalk, TakesNothingFromTheHeapForAChannel) {
  RandomChannels random;
  const KdReportCollection filed = collectionOf(random.make(100), 3);
  const KdReportVisitor keepAll = [](ChannelRecord&) -> std::uint32_t { return kKdReportKeep; };
  const std::size_t before = tbdaily::testing::allocations();
  KdReportIterate(filed.get(), keepAll);
  KdReportPrune(filed.get(), keepAll);
  EXPECT_EQ(tbdaily::testing::allocations(), before);
}

TEST(CollectionWalk, PairsChannelsInTheirOrder) {
  RandomChannels random;
  for (unsigned round = 0; round < kRounds; ++round) {
    const auto earlier = random.make(12), later = random.make(12);
    const auto pairs = [](const KdReportChannel& a, const KdReportChannel& b) {
      return KdReportChannelGetDriverID(a.get()) == KdReportChannelGetDriverID(b.get()) &&
             KdReportChannelGetChannelID(a.get()) == KdReportChannelGetChannelID(b.get()) &&
             KdReportChannelGetFormat(a.get()) == KdReportChannelGetFormat(b.get());
    };
    // Index by index, else forward from behind the last hit.
    std::vector<const ChannelRecord*> expected, partners;
    std::optional<std::size_t> resume;
    for (std::size_t i = 0; i < later.size() && i < earlier.size(); ++i) {
      std::size_t at = i;
      if (!pairs(earlier[i], later[i])) {
        if (!resume) resume = i + 1;
        for (at = *resume; at < earlier.size() && !pairs(earlier[at], later[i]);) ++at;
        if (at == earlier.size()) continue;
        resume = at + 1;
      }
      expected.push_back(earlier[at].get());
    }
    const auto before = collectionOf(earlier), after = collectionOf(later);
    const KdReportCollection result = compareAggregates(
        before.get(), after.get(),
        [&](const ChannelRecord& partner, const ChannelRecord&, ChannelRecord& copy) {
          partners.push_back(&partner);
          EXPECT_NE(copy.elements().data(), partner.elements().data());
          EXPECT_EQ(getRawElements(&copy, KdReportChannelGetFormat(&copy))->word(0, 3), kKdReportInvalid);
          return std::uint32_t{0};
        });
    if (later.empty() || !earlier.empty()) {
      EXPECT_EQ(partners, expected);
      EXPECT_EQ(channelsIn(result.get()).size(), later.size());
    } else {
      EXPECT_EQ(result, nullptr) << "the earlier collection has no channels at this level";
    }
  }
}

TEST(CollectionWalk, StopsAtAnOddAnswer) {
  const KdReportCollection filed =
      collectionOf({channelOf(1, 1), channelOf(1, 2), channelOf(1, 3), channelOf(2, 4)}, 1);
  std::vector<std::int64_t> visited;
  const KdReportVisitor stopAtThree = [&visited](ChannelRecord& channel) -> std::uint32_t {
    visited.push_back(KdReportChannelGetChannelID(&channel));
    return visited.back() == 3 ? kKdReportStop : kKdReportRemove;
  };
  EXPECT_EQ(KdReportIterate(filed.get(), stopAtThree), 1U);
  EXPECT_THAT(visited, ElementsAre(1, 2, 3));
  visited.clear();
  // Pruning goes on with the next driver; what was to be removed before the stop is gone.
  EXPECT_EQ(KdReportPrune(filed.get(), stopAtThree), 1U);
  EXPECT_THAT(visited, ElementsAre(1, 2, 3, 4));
  EXPECT_EQ(KdReportGetChannelCount(filed.get()), 1U);
}

TEST(CollectionWalk, PrunesInOrderUntilTheVisitorThrows) {
  const KdReportCollection flat =
      collectionOf({channelOf(1, 1), channelOf(1, 2), channelOf(1, 3), channelOf(1, 4), channelOf(1, 5)});
  const KdReportVisitor removeOddUntilFour = [](ChannelRecord& channel) -> std::uint32_t {
    const std::int64_t identifier = KdReportChannelGetChannelID(&channel);
    if (identifier == 4) throw std::runtime_error("four");
    return identifier % 2 != 0 ? kKdReportRemove : kKdReportKeep;
  };
  EXPECT_THROW(KdReportPrune(flat.get(), removeOddUntilFour), std::runtime_error);
  std::vector<std::int64_t> left;
  for (const ChannelRecord* channel : channelsIn(flat.get()))
    left.push_back(KdReportChannelGetChannelID(channel));
  EXPECT_THAT(left, ElementsAre(2, 4, 5));
}

TEST(CollectionWalk, RecordsOutliveTheirCollectionWhenHeld) {
  RandomChannels random;
  std::vector<KdReportChannel> held;
  std::vector<std::string> names;
  {
    const KdReportCollection filed = collectionOf(random.make(20), 3);
    const KdReportCollection copy = cloneAggregate(filed.get(), [](const auto&, auto&) { return 0U; });
    KdReportIterate(copy.get(), [&](ChannelRecord& channel) -> std::uint32_t {
      held.push_back(KdReportRetainChannel(channel));
      names.push_back(KdReportChannelCopyDescription(&channel, 0, nullptr).value());
      return kKdReportKeep;
    });
  }
  for (std::size_t i = 0; i < held.size(); ++i)
    EXPECT_EQ(KdReportChannelCopyDescription(held[i].get(), 0, {}), names[i]);
}

TEST(CollectionWalk, FailsOnMalformedCollections) {
  const PlistValue number = PlistValue::int64(1);
  const auto with = [](const char* key, PlistValue value) {
    return KdReportCreateAggregateFromPropertyList(PlistValue::dictionary({{key, std::move(value)}}));
  };
  EXPECT_EQ(KdReportGetChannelCount(with("Other", number).get()), 0U);
  EXPECT_EQ(KdReportCreateAggregateFromPropertyList(number), nullptr);
  EXPECT_EQ(KdReportGetChannelCount(nullptr), kKdReportNoIndex);
  PlistValue deep = PlistValue::dictionary({});
  for (int i = 0; i < 400; ++i)
    deep = PlistValue::dictionary({{"KdReportChannelGroups", PlistValue::dictionary({{"G", deep}})}});
  EXPECT_EQ(KdReportCreateAggregateFromPropertyList(deep), nullptr);

  const KdReportCollection good = collectionOf({channelOf(1, 1)});
  for (const char* key : {"KdReportChannels", "KdReportDrivers", "KdReportChannelGroups"}) {
    for (const PlistValue& value :
         {number, PlistValue::array({number}), PlistValue::dictionary({{"G", number}})}) {
      const KdReportCollection bad = with(key, value);
      EXPECT_EQ(KdReportGetChannelCount(bad.get()), kKdReportNoIndex) << key;
      const KdReportCollection again =
          KdReportCreateAggregateFromPropertyList(KdReportCopyPropertyList(bad.get()));
      EXPECT_EQ(KdReportGetChannelCount(again.get()), kKdReportNoIndex) << key;
      EXPECT_EQ(KdReportPrune(bad.get(), [](ChannelRecord&) { return 0U; }), kKdReportWalkFailed);
      EXPECT_EQ(cloneAggregate(bad.get(), [](const auto&, auto&) { return 0U; }), nullptr);
      EXPECT_EQ(KdReportCreateSamplesDelta(good.get(), bad.get()), nullptr);
      std::optional<ReportError> error;
      EXPECT_EQ(KdReportMergeChannels(good.get(), bad.get(), &error), kKdReportWalkFailed);
      EXPECT_EQ(error.value().code, kKdError) << key;
    }
  }
  // A channel without a readable type fails a comparison on either side; so does a level that the other
  // lacks.
  const KdReportCollection untyped =
      with("KdReportChannels", PlistValue::array({PlistValue::dictionary({})}));
  EXPECT_EQ(KdReportCreateSamplesDelta(untyped.get(), good.get()), nullptr);
  EXPECT_EQ(KdReportCreateSamplesDelta(good.get(), untyped.get()), nullptr);
  EXPECT_EQ(KdReportCreateSamplesDelta(good.get(), collectionOf({channelOf(1, 1)}, 1).get()), nullptr);
}

TEST(CollectionWalk, PropertyListsReadBack) {
  RandomChannels random;
  const KdReportCollection filed = collectionOf(random.make(30), 3);
  for (ChannelRecord* channel : channelsIn(filed.get())) KdReportChannelGetChannelName(channel);
  const PlistValue kept = KdReportCopyPropertyList(filed.get());
  const KdReportCollection again = KdReportCreateAggregateFromPropertyList(kept);
  EXPECT_EQ(KdReportCopyPropertyList(again.get()), kept);
  EXPECT_EQ(KdReportGetChannelCount(again.get()), KdReportGetChannelCount(filed.get()));
}

}  // namespace
}  // namespace kdreport

#include <gmock/gmock.h>

#include "drivermetrics/metrics_test_support.h"
#include "drivermetrics/report_error.h"

namespace kdreport {
namespace {

using testing::channelOf, testing::channelsIn, testing::channelType, testing::publishingDriver;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

PlistValue entry(std::int64_t identifier, std::uint64_t type, const char* name = nullptr) {
  return testing::legendEntry(identifier, {type}, name);
}

PlistValue group(const char* name, const char* subGroup, PlistArray channels) {
  return testing::legendGroup(name, subGroup, KdReportCreateUnitInfo(0x64'00000000000000),
                              std::move(channels));
}

struct Discovery : ::testing::Test {
  ~Discovery() override { EXPECT_EQ(registry_.openHandles(), 0U); }

  // What one driver with this legend gives: names and statuses.
  std::string read(PlistValue legend, std::uint32_t options = kKdReportFlat) {
    registry_.drivers = {publishingDriver(0x2A, "D", {})};
    registry_.drivers[0].properties.set("KdReportLegend", std::move(legend));
    const KdHandle handle = registry_.KdServiceGetMatchingService(registry_.KdServiceMatching("Driver"));
    std::optional<ReportError> error;
    const auto channels = KdReportCopyChannelsForDriver(registry_, handle, options, &error);
    registry_.KdObjectRelease(handle);
    EXPECT_NE(channels == nullptr, !error);
    if (error) return error->reason + " " + std::to_string(static_cast<std::uint32_t>(error->code) & 0xFFF);
    std::string names;
    for (ChannelRecord* channel : channelsIn(channels.get()))
      names += std::string(KdReportChannelGetChannelName(channel).value_or("-")) + " ";
    return names;
  }

  testing::FakeDriverRegistry registry_;
};

TEST_F(Discovery, ReadsALegendUntilItIsMalformed) {
  const PlistValue good = group("G", "S", {entry(0x54454D50, 1), entry(0xFF, 1), entry(3, 1, "Named")});
  const PlistValue last = group("Last", nullptr, {entry(0x4C, 1)});
  const std::string goodNames = "TEMP - Named ";
  const std::string failed = "createPVErr() passed a NULL string! 700";
  const std::vector<std::pair<PlistValue, std::string>> cases = {
      {{}, "no legend 752"},
      {PlistValue::dictionary({}), "bad legend 713"},
      {PlistValue::array({good, last}), goodNames + "L "},
      {PlistValue::array({good, PlistValue::int64(1), last}), goodNames},
      {PlistValue::array({good, group(nullptr, "S", {entry(1, 1)}), last}), goodNames},
      {PlistValue::array({good, group("G", nullptr, {PlistValue::int64(1), entry(1, 1)}), last}),
       goodNames + "L "},
      {PlistValue::array({good, group("G", nullptr, {PlistValue::array({PlistValue::int64(1)})}), last}),
       failed},
      {PlistValue::array({good, group("G", nullptr, {entry(kKdReportInvalid, 1)}), last}), failed},
  };
  for (std::size_t row = 0; row < cases.size(); ++row)
    EXPECT_EQ(read(cases[row].first), cases[row].second) << "row " << row;

  registry_.drivers[0].properties.remove("KdReportLegendPublic");
  const KdHandle handle = registry_.KdServiceGetMatchingService(registry_.KdServiceMatching("Driver"));
  EXPECT_TRUE(channelsIn(KdReportCopyChannelsForDriver(registry_, handle, 0).get()).empty());
  registry_.drivers[0].retainCount = 0;
  std::optional<ReportError> error;
  EXPECT_EQ(KdReportCopyChannelsForDriver(registry_, handle, 0, &error), nullptr);
  EXPECT_EQ(error->reason, "invalid driver");
  registry_.KdObjectRelease(handle);
}

TEST_F(Discovery, TakesAnyKindOfValueInALegend) {
  const std::string failed = "createPVErr() passed a NULL string! 700";
  for (const PlistValue& odd :
       {PlistValue::boolean(true), PlistValue::string("S"), PlistValue::int64(INT64_MIN),
        PlistValue::float64(1.5), PlistValue::data(PlistData(3)), PlistValue::array({}),
        PlistValue::dictionary({}), PlistValue(PlistDate{1})}) {
    const bool isString = odd.asString().has_value(), isArray = odd.asArray() != nullptr;
    const auto groupWith = [&odd](const char* key) {
      PlistDictionary fields = *group("G", "S", {entry(0x41, 1)}).asDictionary();
      fields.set(key, odd);
      return PlistValue::array({PlistValue::dictionary(fields)});
    };
    const auto entryWith = [&odd](std::size_t place) {
      PlistArray places = *entry(0x41, 1, "A").asArray();
      places[place] = odd;
      return PlistValue::array({group("G", "S", {PlistValue::array(places)})});
    };
    const std::string number = odd.asNumber() && odd.asNumber()->isReal() ? "A " : failed;
    EXPECT_EQ(read(groupWith("KdReportGroupName"), 3), isString ? "A " : "") << "a subgroup needs a group";
    EXPECT_EQ(read(groupWith("KdReportSubGroupName"), 3), "A ");
    EXPECT_EQ(read(groupWith("KdReportChannelInfo"), 3), "A ");
    EXPECT_EQ(read(groupWith("KdReportChannels"), 3), "");
    EXPECT_EQ(read(PlistValue::array({group("G", "S", {odd})}), 3), isArray ? failed : "");
    EXPECT_EQ(read(entryWith(0), 3), number);
    EXPECT_EQ(read(entryWith(1), 3), number);
    EXPECT_EQ(read(entryWith(2), 3), isString ? "S " : "A ");
  }
}

TEST_F(Discovery, FilesChannelsByDriverGroupAndSubgroup) {
  registry_.drivers = {publishingDriver(
      0x2A, "D", {group("G", "S", {entry(1, 0x1000001, "a")}), group(nullptr, nullptr, {entry(2, 1, "b")})})};
  const KdReportCollection filed = KdReportCopyAllChannels(registry_, 3);
  ASSERT_NE(filed->drivers.get()->find("D <id 0x2a>"), nullptr);
  ChannelCollection* one = filed->drivers.get()->find("D <id 0x2a>")->get();
  EXPECT_EQ(one->channels.get()->size(), 1U);
  ChannelRecord* channel = one->channelGroups.get()
                               ->find("G")
                               ->get()
                               ->channelGroups.get()
                               ->find("S")
                               ->get()
                               ->channels.get()
                               ->begin()[0];
  EXPECT_EQ(KdReportChannelGetDriverID(channel), 0x2A);
  EXPECT_EQ(KdReportChannelGetCategories(channel), 0x100);
  EXPECT_EQ(KdReportChannelGetUnitLabel(channel), "events");

  // Merging files the records themselves, and what is cached in one collection shows in the other.
  const KdReportCollection flat = KdReportCreateAggregate(kKdReportFlat);
  EXPECT_EQ(KdReportMergeChannels(flat.get(), filed.get()), 0U);
  EXPECT_EQ(channelsIn(flat.get()), channelsIn(filed.get()));
  std::optional<ReportError> error;
  EXPECT_EQ(KdReportMergeChannels(flat.get(), flat.get(), &error), kKdReportWalkFailed);
  EXPECT_EQ(error->reason, "bad argument");
}

TEST_F(Discovery, NamesDriversThatFailAndGoesOn) {
  registry_.drivers = {publishingDriver(1, "Bad", {}),
                       publishingDriver(2, "Good", {group(nullptr, nullptr, {entry(0x41, 1)})})};
  registry_.drivers[0].properties.set("KdReportLegend", PlistValue::int64(1));
  ::testing::internal::CaptureStderr();
  const KdReportCollection all = KdReportCopyAllChannels(registry_, 0);
  EXPECT_EQ(::testing::internal::GetCapturedStderr(), "Bad <id 0x1>: bad legend\n");
  EXPECT_EQ(channelsIn(all.get()).size(), 1U);
  std::string said;
  KdReportSetLogSink([&said](std::string_view line) { said += line; });
  (void)KdReportCopyAllChannels(registry_, 0);
  KdReportSetLogSink(nullptr);
  EXPECT_EQ(said, "Bad <id 0x1>: bad legend");

  std::optional<ReportError> error;
  const PlistValue matching = registry_.KdServiceMatching("Driver");
  EXPECT_EQ(KdReportCopyChannelsForDrivers(registry_, matching, 0, &error), nullptr);
  EXPECT_EQ(error->code, kKdError);
  EXPECT_FALSE(KdReportErrorHasReason(*error));
  EXPECT_EQ(KdReportCopyStatusText(error->code), "general failure");
  EXPECT_EQ(KdReportCopyStatusText(7), "status 0x00000007");
  EXPECT_EQ(KdReportCopyChannelsForDrivers(registry_, {}, 0, &error), nullptr);
  EXPECT_EQ(error->reason, "no matching dict");

  const KdReportCollection same = KdReportCopyChannelsWithID(registry_, matching, 0x41, &error);
  EXPECT_EQ(channelsIn(same.get()).size(), 2U);
  EXPECT_EQ(KdReportChannelGetFormat(channelsIn(same.get())[0]), 0);
  registry_.drivers[1].identifier.reset();
  EXPECT_EQ(KdReportCopyChannelsWithID(registry_, matching, 0x41, &error), nullptr);
  EXPECT_EQ(error->reason, "error extracting driver info");

  registry_.iteratorsAreValid = false;
  EXPECT_EQ(KdReportCopyAllChannels(registry_, 0, &error), nullptr);
  EXPECT_EQ(error->code, kKdAborted);
  registry_.drivers.clear();
  EXPECT_EQ(KdReportCopyAllChannels(registry_, 0, &error), nullptr);
  EXPECT_EQ(error->code, kKdNotFound);
}

TEST_F(Discovery, SelectsByCategoryFormatUnitAndGroup) {
  registry_.drivers = {publishingDriver(1, "D",
                                        {
                                            group("G", "S", {entry(0x41, 0x1000001), entry(0x42, 0x2000002)}),
                                            group("G", nullptr, {entry(0x43, 2)}),
                                            group("H", "S", {entry(0x44, 0x1000001)}),
                                        })};
  const auto names = [](const KdReportCollection& channels) {
    std::string all;
    for (ChannelRecord* channel : channelsIn(channels.get()))
      all += KdReportChannelGetChannelName(channel).value();
    return all;
  };
  EXPECT_EQ(names(KdReportCopyChannelsInCategories(registry_, 0x100, 3)), "AD");
  EXPECT_EQ(names(KdReportCopyChannelsOfFormat(registry_, 0x102, 0)), "BC");
  EXPECT_EQ(names(KdReportCopyChannelsWithUnit(registry_, 0x64'00000000000000, 0)), "ABCD");
  const char* const none = nullptr;
  EXPECT_EQ(names(KdReportCopyChannelsInGroup(registry_, "G", none, 3)), "CAB");
  EXPECT_EQ(names(KdReportCopyChannelsInGroup(registry_, nullptr, std::string("S"), 0)), "ABD");
  EXPECT_EQ(names(KdReportCopyChannelsInGroup(registry_, "G", "S", 0)), "AB");
  std::optional<ReportError> error;
  EXPECT_EQ(KdReportCopyChannelsInGroup(registry_, {}, {}, 0, &error), nullptr);
  EXPECT_EQ(error->reason, "no group or subgroup!");
  EXPECT_TRUE(KdReportErrorHasReason(*error));
  EXPECT_EQ(KdReportSelectChannelsInGroup(nullptr, "G", {}, &error), 1U);
  EXPECT_EQ(error->reason, "channel pruning failed");
}

TEST(ChannelRecords, AnswerForWhatIsMissing) {
  const KdReportChannel empty = testing::emptyChannel();
  for (ChannelRecord* channel : {empty.get(), static_cast<ChannelRecord*>(nullptr)}) {
    EXPECT_EQ(KdReportChannelGetDriverID(channel), kKdReportInvalid);
    EXPECT_EQ(KdReportChannelGetChannelID(channel), kKdReportInvalid);
    EXPECT_EQ(KdReportChannelGetUnit(channel), kKdReportInvalid);
    EXPECT_EQ(KdReportChannelGetFormat(channel), 0);
    EXPECT_EQ(KdReportChannelGetCategories(channel), 0xFFFF);
    EXPECT_FALSE(KdReportChannelGetGroup(channel) || KdReportChannelGetChannelName(channel) ||
                 KdReportChannelGetUnitLabel(channel));
    EXPECT_EQ(setChannelType(channel, channelType(1)), kKdError);
  }
  const KdReportCollection byDriver = KdReportCreateAggregate(kKdReportFileByDriver);
  std::optional<ReportError> error;
  EXPECT_EQ(_addChannel(byDriver.get(), testing::emptyChannel(), 1, &error), kKdError);
  EXPECT_EQ(error->reason, "_addChannel() failed");
  EXPECT_EQ(KdReportAddChannelDescription(byDriver.get(), {.channelID = kKdReportInvalid}, &error), kKdError);
  EXPECT_EQ(KdReportAddChannelDescription(
                byDriver.get(),
                {.driverID = 7, .driverName = "D", .channelID = 8, .channelType = channelType(4, 3)}),
            kKdSuccess);
  EXPECT_EQ(KdReportChannelGetFormat(channelsIn(byDriver.get())[0]), 4);
  const char* const none = nullptr;
  EXPECT_EQ(KdReportAddChannelDescription(byDriver.get(), {.driverName = none, .channelID = 8}), kKdError);
}

}  // namespace
}  // namespace kdreport

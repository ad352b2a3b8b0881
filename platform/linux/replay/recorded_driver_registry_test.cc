// The driver registry of a recording, with its storage clients and its metrics hub.
#include "platform/linux/replay/recorded_driver_registry.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <fstream>

#include "platform/byte_reader.h"
#include "platform/byte_writer.h"
#include "platform/driver_handle.h"
#include "platform/linux/host_test_support.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;
using Bytes = std::vector<int>;
using Numbers = std::vector<std::uint64_t>;

constexpr std::int64_t kFailure = 0xE00002C5;

struct DriversTest : ::testing::Test {
  void put(PlistArray entries) {
    device.record(recording::kRegistry, "entries", PlistValue::array(std::move(entries)));
  }
  // Opens the user client of the only driver.
  void open(PlistValue client) {
    put({PlistValue::dictionary({{"class", PlistValue::string("C")}, {"client", std::move(client)}})});
    const KdHandle service = registry.KdServiceGetMatchingService(registry.KdServiceMatching("C"));
    openStatus = registry.KdServiceOpen(service, 0, connection);
    registry.KdObjectRelease(service);
  }
  // Calls with a request and answers the bytes that came, or the status below zero as one number.
  Bytes call(std::uint32_t method, const Bytes& request, std::size_t room) {
    std::vector<std::byte> input, output(room);
    for (const int byte : request) input.push_back(static_cast<std::byte>(byte));
    std::size_t size = room;
    const KdStatus result = registry.KdConnectCallStructMethod(connection, method, input, output, size);
    if (result != 0) return {result};
    Bytes answer;
    for (std::size_t i = 0; i < size; ++i) answer.push_back(std::to_integer<int>(output[i]));
    return answer;
  }
  static Bytes request(int code, int flags) {
    Bytes bytes(24, 0);
    bytes[0] = code;
    bytes[4] = flags;
    return bytes;
  }

  testing::TestHost device;
  Recordings recordings{device.host, device.codec};
  RecordedDriverRegistry registry{recordings};
  KdHandle connection = 0;
  KdStatus openStatus = 0;
};

TEST_F(DriversTest, AWalkIsNoLongerValidWhenTheRegistryChanged) {
  EXPECT_TRUE(registry.KdServiceMatching("C").isNone());
  put({testing::plistOf(R"({"class": "C"})")});
  KdHandle iterator = 0;
  ASSERT_EQ(registry.KdServiceGetMatchingServices(registry.KdServiceMatching("C"), iterator), 0);
  EXPECT_TRUE(registry.KdIteratorIsValid(iterator));
  put({});
  EXPECT_FALSE(registry.KdIteratorIsValid(iterator));
  EXPECT_EQ(registry.openHandles(), 1U);
  EXPECT_EQ(registry.KdObjectRelease(iterator), 0);
  EXPECT_EQ(registry.openHandles(), 0U);
}

TEST_F(DriversTest, ALongNameIsCutBetweenCharacters) {
  const std::string kept(127, 'x');
  for (const auto& [recorded, answered] : {std::pair{kept + "\u00FC", kept}, {kept + "yz", kept + "y"}}) {
    put({PlistValue::dictionary(
        {{"class", PlistValue::string("C")}, {"name", PlistValue::string(recorded)}})});
    const DriverHandle entry(registry, registry.KdServiceGetMatchingService(registry.KdServiceMatching("C")));
    std::string name;
    EXPECT_EQ(registry.KdRegistryEntryGetName(entry.get(), name), 0);
    EXPECT_EQ(name, answered);
  }
}

TEST_F(DriversTest, AStorageClientTellsRequestsApartAndIsStrict) {
  device.put("/System/Device/six", "abcdef");
  device.put("/System/Device/seven", "ABCDEFG");
  device.put("/outside", "secret");
  PlistDictionary client = testing::dictionaryOf(R"({"kind": "storage", "closeStatus": 3, "buffers": [
      {"method": 9, "code": 13, "file": "six", "fill": 5},
      {"method": 9, "code": 13, "file": "seven", "list": 1},
      {"method": 9, "code": 15, "file": "six", "size": 4294967295},
      {"method": 9, "code": 16, "sizeStatus": -536870206, "dataStatus": 3758097090},
      {"method": 9, "code": 17, "file": "../../outside"}, {"method": 5, "code": 13, "file": "six"},
      {"method": 8, "file": "seven"}]})");
  client.set("recommendation", PlistValue::dictionary({{"method", PlistValue::int64(5)},
                                                       {"data", PlistValue::data(PlistData(2))}}));
  open(PlistValue::dictionary(client));
  EXPECT_EQ(call(9, request(13, 1), 4), (Bytes{6, 0, 0, 0}));
  EXPECT_EQ(call(9, request(13, 0), 6).size(), 5U);
  // The extended flag is the caller's; what fits is filled.
  EXPECT_EQ(call(9, request(13, 2), 3), (Bytes{'a', 'b', 'c'}));
  EXPECT_EQ(call(9, request(13, 4), 7).back(), 'G');
  EXPECT_EQ(call(9, request(15, 1), 4), (Bytes{255, 255, 255, 255}));
  EXPECT_EQ(call(8, {}, 4), (Bytes{7, 0, 0, 0}));
  EXPECT_EQ(call(8, {}, 7).size(), 7U);
  EXPECT_EQ(call(5, {}, 8), (Bytes{0, 0}));
  EXPECT_EQ(call(5, request(13, 1), 4), (Bytes{6, 0, 0, 0}));
  EXPECT_EQ(call(9, request(16, 1), 4), Bytes{-536870206});
  EXPECT_EQ(call(9, request(16, 0), 9), Bytes{-536870206});
  auto reserved = request(13, 1);
  reserved[23] = 1;
  const std::tuple<std::uint32_t, Bytes, std::size_t> refused[] = {
      {9, reserved, 4},       {9, Bytes(23, 0), 4},   {9, request(13, 0), 4},
      {9, request(13, 8), 6}, {8, request(13, 0), 6}, {9, request(99, 0), 6}};
  for (const auto& [method, bad, room] : refused) {
    EXPECT_EQ(call(method, bad, room), Bytes{kKdBadArgument}) << ::testing::PrintToString(bad);
  }
  EXPECT_EQ(call(9, request(17, 0), 6), Bytes{kKdNotFound});
  EXPECT_EQ(registry.KdServiceClose(connection), 3);
  EXPECT_EQ(registry.openHandles(), 0U);
  EXPECT_EQ(call(5, {}, 8), Bytes{kKdBadArgument});

  open(testing::plistOf(R"({"kind": "storage", "openStatus": 3758097093})"));
  EXPECT_EQ(openStatus, static_cast<KdStatus>(kFailure));
  EXPECT_EQ(registry.openHandles(), 0U);
}

std::vector<std::byte> interests(const Numbers& channels) {
  std::vector<std::byte> list;
  appendLittleEndian(list, channels.size());
  for (const std::uint64_t id : channels) {
    appendLittleEndian(list, std::uint64_t{7});
    appendLittleEndian(list, id);
    appendLittleEndian(list, std::uint64_t{0});
  }
  return list;
}

struct HubTest : DriversTest {
  HubTest() {
    record(R"([{"driver": 7, "channel": 1, "type": 1, "elements": [{"stamp": 1, "words": [1]}]}])");
  }
  void record(std::string_view channels) {
    device.record(recording::kHub, "channels", testing::plistOf(channels));
  }
  void openHub(PlistDictionary client = {}) {
    client.set("kind", PlistValue::string("hub"));
    open(PlistValue::dictionary(client));
  }
  KdStatus start(std::uint32_t method = 0) {
    std::size_t count = 0;
    return registry.KdConnectCallScalarMethod(connection, method, {}, {}, count);
  }
  KdStatus configure(std::span<const std::byte> list, std::size_t room = 1) {
    KdMethodOutput output;
    output.scalars = std::span(&identifier, room);
    return registry.KdConnectCallMethod(connection, 2, {{}, list}, output);
  }
  KdStatus update(std::span<const std::uint64_t> scalars, std::uint32_t method = 3) {
    KdMethodOutput output;
    return registry.KdConnectCallMethod(connection, method, {scalars, {}}, output);
  }
  KdStatus update() { return update({&identifier, 1}); }
  KdStatus map() {
    return registry.KdConnectMapMemory(connection, static_cast<std::uint32_t>(identifier), memory);
  }
  // Everything up to the mapping.
  void subscribe(const Numbers& channels) {
    openHub();
    ASSERT_EQ(start(), 0);
    ASSERT_EQ(configure(interests(channels)), 0);
    ASSERT_EQ(map(), 0);
  }
  Numbers at(std::size_t index) const {
    Numbers numbers;
    for (std::size_t i = 0; i < 8; ++i)
      numbers.push_back(ByteReader(memory).at<std::uint64_t>(index * 64 + i * 8).value_or(0xDEAD));
    return numbers;
  }
  // Mappings and descriptors of shared buffers that the process holds.
  static std::size_t held() {
    std::size_t count = 0;
    std::ifstream maps("/proc/self/maps");
    for (std::string line; std::getline(maps, line);) count += line.find("memfd:") != std::string::npos;
    for (const auto& file : std::filesystem::directory_iterator("/proc/self/fd")) {
      std::error_code ignored;
      count += std::filesystem::read_symlink(file, ignored).native().find("memfd:") != std::string::npos;
    }
    return count;
  }

  std::uint64_t identifier = 0;
  std::span<std::byte> memory;
};

TEST_F(HubTest, LaysOutInterestsInOrderAndUpdatesInPlace) {
  constexpr std::int64_t kLyingType = 0x0900'0001'0002;
  record(R"([1, {"driver": 7},
      {"driver": 7, "channel": 1, "type": 17, "elements": [{"stamp": 10, "words": [1]}]},
      {"driver": 7, "channel": 1, "type": 99, "elements": [{"stamp": 9, "words": [9]}, {}]},
      {"driver": 8, "channel": 2, "type": 18, "elements": [{"stamp": 11, "words": [1]}]},
      {"driver": 7, "channel": 2, "type": 9895604715522, "elements": [
          {"stamp": 20, "words": [1, -2, 3, 4, 5]}, {"stamp": "x", "words": [true, 5]}, 3]},
      {"driver": 7, "channel": 4, "type": 1, "elements": []}, {"driver": 7, "channel": 5, "elements": 1}])");
  subscribe({2, 3, 1, 4, 5, 1});
  EXPECT_GT(identifier >> 32, 0U);
  EXPECT_NE(static_cast<std::uint32_t>(identifier), 0U);
  ASSERT_EQ(memory.size(), 5 * 64U);
  EXPECT_THAT(at(0), ElementsAre(7, 2, kLyingType, 20, 1, ~std::uint64_t{1}, 3, 4));
  EXPECT_THAT(at(1), ElementsAre(7, 2, kLyingType, 0, 0, 5, 0, 0));
  EXPECT_THAT(at(2), ElementsAre(7, 2, kLyingType, 0, 0, 0, 0, 0));
  for (const std::size_t twice : {3U, 4U}) EXPECT_THAT(at(twice), ElementsAre(7, 1, 17, 10, 1, 0, 0, 0));

  // Longer than laid out, shorter, and another type; seen through the same mapping.
  record(R"([
      {"driver": 7, "channel": 1, "type": 19, "elements": [{"stamp": 30, "words": [6, 7]}, {"stamp": 31}]},
      {"driver": 7, "channel": 2, "type": 5, "elements": [{"stamp": 32, "words": []}]}])");
  EXPECT_EQ(update(), 0);
  EXPECT_THAT(at(0), ElementsAre(7, 2, 5, 32, 0, 0, 0, 0));
  EXPECT_THAT(at(1), ElementsAre(7, 2, kLyingType, 0, 0, 5, 0, 0));
  EXPECT_THAT(at(3), ElementsAre(7, 1, 19, 30, 6, 7, 0, 0));
  EXPECT_EQ(at(3), at(4));
  const Numbers before = at(3);
  record("1");
  EXPECT_EQ(update(), 0);
  EXPECT_EQ(at(3), before);
}

TEST_F(HubTest, LeavesNothingBehind) {
  subscribe({1});
  const std::span<std::byte> first = memory;
  ASSERT_EQ(map(), 0);
  EXPECT_NE(first.data(), memory.data());
  EXPECT_EQ(held(), 4U);  // a descriptor, the hub's mapping and two of the client's
  const auto type = static_cast<std::uint32_t>(identifier);
  EXPECT_EQ(registry.KdConnectUnmapMemory(connection, type, first), 0);
  EXPECT_EQ(held(), 3U);
  for (const auto& [badType, bad] : {std::pair{type, first}, {type, memory.first(63)}, {type + 1, memory}})
    EXPECT_EQ(registry.KdConnectUnmapMemory(connection, badType, bad), kKdBadArgument);
  EXPECT_EQ(registry.KdServiceClose(connection), 0);
  EXPECT_EQ(held(), 0U);

  subscribe({2});  // nothing of it is there
  EXPECT_TRUE(memory.empty());
  EXPECT_EQ(held(), 0U);
  EXPECT_EQ(update(), 0);
  EXPECT_EQ(registry.KdConnectUnmapMemory(connection, type, memory), 0);
}

TEST_F(HubTest, IsStrict) {
  open(testing::plistOf(R"({"kind": "else"})"));
  EXPECT_EQ(openStatus, kKdNotFound);
  openHub();
  const auto list = interests({1});
  EXPECT_EQ(configure(list), kKdBadArgument);
  EXPECT_EQ(start(1), kKdBadArgument);
  EXPECT_EQ(start(), 0);
  auto longer = list;
  longer.resize(list.size() + 1);
  auto countTooLarge = list;
  countTooLarge[3] = std::byte{0xFF};
  for (const std::size_t length : {0U, 7U, 8U, 31U})
    EXPECT_EQ(configure(std::span(list).first(length)), kKdBadArgument) << length;
  for (const auto& bad : {longer, countTooLarge}) EXPECT_EQ(configure(bad), kKdBadArgument) << bad.size();
  EXPECT_EQ(configure(list, 0), kKdBadArgument);
  EXPECT_EQ(map(), kKdBadArgument);
  EXPECT_EQ(update(), kKdBadArgument);
  EXPECT_EQ(configure(list), 0);
  EXPECT_EQ(configure(list), kKdBadArgument);
  for (const Numbers& bad : {Numbers{}, Numbers{identifier & 0xFFFFFFFF}, Numbers{identifier, 0}})
    EXPECT_EQ(update(bad), kKdBadArgument);
  EXPECT_EQ(update({&identifier, 1}, 4), kKdBadArgument);
  EXPECT_EQ(registry.KdConnectMapMemory(connection, static_cast<std::uint32_t>(identifier) + 1, memory),
            kKdBadArgument);
}

TEST_F(HubTest, FailsAsRecorded) {
  // Of opening, method 0, configuring, mapping and updating, which one fails; what follows is refused.
  const char* keys[] = {"openStatus", "userClientOpenStatus", "configureStatus", "mapStatus", "updateStatus"};
  for (std::size_t failing = 0; failing < std::size(keys); ++failing) {
    openHub({{keys[failing], PlistValue::int64(kFailure)}});
    const KdStatus statuses[] = {openStatus, start(), configure(interests({1})), map(), update()};
    for (std::size_t step = 0; step <= failing; ++step)
      EXPECT_EQ(statuses[step], step == failing ? static_cast<KdStatus>(kFailure) : 0) << keys[failing];
  }
}

TEST_F(HubTest, WithoutMemoryItStaysUnconfigured) {
  std::string elements = "{}";
  for (int i = 1; i < 4096; ++i) elements += ", {}";
  record(R"([{"driver": 7, "channel": 1, "type": 1, "elements": [)" + elements + "]}]");
  openHub();
  EXPECT_EQ(start(), 0);
  const auto one = interests({1});
  const auto tooMany = interests(Numbers(4097, 1));  // each of 256 KiB: one above a GiB
  EXPECT_EQ(configure(tooMany), kKdNoMemory);
  {
    const testing::ResourceLimit small(RLIMIT_FSIZE, 100);
    EXPECT_EQ(configure(one), kKdNoMemory);
  }
  EXPECT_EQ(held(), 0U);
  EXPECT_EQ(configure(one), 0);
}

}  // namespace
}  // namespace tbdaily

// The driver registry and its storage clients on a recording.
#include <gtest/gtest.h>

#include "platform/linux/linux_driver_registry.h"
#include "platform/linux/test_host.h"

namespace tbdaily {
namespace {

using Bytes = std::vector<int>;

class DriversTest : public ::testing::Test {
 protected:
  void put(std::string_view entries) { device.record(recording::kRegistry, "entries", device.json(entries)); }
  // A connection to a storage client with these entries.
  KdHandle open(PlistDictionary client) {
    client.set("kind", PlistValue::string("storage"));
    const PlistValue entry = PlistValue::dictionary(
        {{"class", PlistValue::string("C")}, {"client", PlistValue::dictionary(client)}});
    device.record(recording::kRegistry, "entries", PlistValue::array({entry}));
    const KdHandle service = registry.KdServiceGetMatchingService(registry.KdServiceMatching("C"));
    KdHandle connection = 0;
    status = registry.KdServiceOpen(service, 0, connection);
    registry.KdObjectRelease(service);
    return connection;
  }
  // Calls with a request and answers the bytes that came, or the status below zero as one number.
  Bytes call(KdHandle connection, std::uint32_t method, const Bytes& request, std::size_t room) {
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
  LinuxDriverRegistry registry{recordings};
  KdStatus status = 0;
};

TEST_F(DriversTest, AWalkIsNoLongerValidWhenTheRegistryChanged) {
  EXPECT_TRUE(registry.KdServiceMatching("C").isNone());
  put(R"([{"class": "C"}])");
  KdHandle iterator = 0;
  ASSERT_EQ(registry.KdServiceGetMatchingServices(registry.KdServiceMatching("C"), iterator), 0);
  EXPECT_TRUE(registry.KdIteratorIsValid(iterator));
  put("[]");
  EXPECT_FALSE(registry.KdIteratorIsValid(iterator));
  EXPECT_EQ(registry.openHandles(), 1U);
  EXPECT_EQ(registry.KdObjectRelease(iterator), 0);
  EXPECT_EQ(registry.openHandles(), 0U);
}

TEST_F(DriversTest, AStorageClientTellsRequestsApartAndIsStrict) {
  device.put("/System/Device/six", "abcdef");
  device.put("/System/Device/seven", "ABCDEFG");
  device.put("/outside", "secret");
  const PlistValue buffers = device.json(R"([
      {"method": 9, "code": 13, "file": "six", "fill": 5},
      {"method": 9, "code": 13, "file": "seven", "list": 1},
      {"method": 9, "code": 15, "file": "six", "size": 4294967295},
      {"method": 9, "code": 16, "sizeStatus": -536870206, "dataStatus": 3758097090},
      {"method": 9, "code": 17, "file": "../../outside"},
      {"method": 8, "file": "seven"}])");
  const PlistValue recommendation =
      PlistValue::dictionary({{"method", PlistValue::int64(5)}, {"data", PlistValue::data(PlistData(2))}});
  const KdHandle connection =
      open({{"buffers", buffers}, {"recommendation", recommendation}, {"closeStatus", PlistValue::int64(3)}});
  EXPECT_EQ(call(connection, 9, request(13, 1), 4), (Bytes{6, 0, 0, 0}));
  EXPECT_EQ(call(connection, 9, request(13, 0), 6).size(), 5U);
  // The extended flag is the caller's; what fits is filled.
  EXPECT_EQ(call(connection, 9, request(13, 2), 3), (Bytes{'a', 'b', 'c'}));
  EXPECT_EQ(call(connection, 9, request(13, 4), 7).back(), 'G');
  EXPECT_EQ(call(connection, 9, request(15, 1), 4), (Bytes{255, 255, 255, 255}));
  EXPECT_EQ(call(connection, 8, {}, 4), (Bytes{7, 0, 0, 0}));
  EXPECT_EQ(call(connection, 8, {}, 7).size(), 7U);
  EXPECT_EQ(call(connection, 5, {}, 8), (Bytes{0, 0}));
  EXPECT_EQ(call(connection, 9, request(16, 1), 4), Bytes{-536870206});
  EXPECT_EQ(call(connection, 9, request(16, 0), 9), Bytes{-536870206});
  auto reserved = request(13, 1);
  reserved[23] = 1;
  for (const auto& [method, bad, room] : {std::tuple{9U, reserved, 4UL},
                                          {9U, Bytes(23, 0), 4UL},
                                          {9U, request(13, 0), 4UL},
                                          {9U, request(13, 8), 6UL},
                                          {8U, request(13, 0), 6UL},
                                          {9U, request(99, 0), 6UL}}) {
    EXPECT_EQ(call(connection, method, bad, room), Bytes{kKdBadArgument});
  }
  EXPECT_EQ(call(connection, 9, request(17, 0), 6), Bytes{kKdNotFound});
  EXPECT_EQ(registry.KdServiceClose(connection), 3);
  EXPECT_EQ(registry.openHandles(), 0U);
  EXPECT_EQ(call(connection, 5, {}, 8), Bytes{kKdBadArgument});

  EXPECT_EQ(open({{"openStatus", PlistValue::int64(0xE00002C5)}}), 0U);
  EXPECT_EQ(status, static_cast<KdStatus>(0xE00002C5));
  EXPECT_EQ(registry.openHandles(), 0U);
}

}  // namespace
}  // namespace tbdaily

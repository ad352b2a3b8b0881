// The driver registry and its storage clients on a recording.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/linux_driver_registry.h"
#include "platform/linux/test_host.h"

namespace tbdaily {
namespace {

PlistValue dict(PlistDictionary entries = {}) {
  return PlistValue::dictionary(std::move(entries));
}
PlistValue number(std::int64_t n) {
  return PlistValue::int64(n);
}
PlistValue text(const char* t) {
  return PlistValue::string(t);
}
PlistValue bytes(std::size_t count) {
  return PlistValue::data(PlistData(count, std::byte{0x5a}));
}

class DriversTest : public ::testing::Test {
 protected:
  void put(PlistArray entries) {
    device.record(recording::kRegistry, "entries", PlistValue::array(std::move(entries)));
  }
  KdHandle find(std::string_view serviceClass) {
    return registry.KdServiceGetMatchingService(registry.KdServiceMatching(serviceClass));
  }
  // A connection to a storage client with these entries.
  KdHandle open(PlistDictionary client) {
    client.set("kind", text("storage"));
    put({dict({{"id", number(1)}, {"name", text("n")}, {"class", text("C")}, {"client", dict(client)}})});
    const KdHandle service = find("C");
    KdHandle connection = 0;
    status = registry.KdServiceOpen(service, 0, connection);
    registry.KdObjectRelease(service);
    return connection;
  }
  // Calls with a request and answers the bytes that came, or the status below zero as one number.
  std::vector<int> call(KdHandle connection, std::uint32_t method, std::vector<int> request,
                        std::size_t room) {
    std::vector<std::byte> input, output(room);
    for (const int byte : request) input.push_back(static_cast<std::byte>(byte));
    std::size_t size = room;
    const KdStatus result = registry.KdConnectCallStructMethod(connection, method, input, output, size);
    if (result != 0) return {result};
    std::vector<int> answer;
    for (std::size_t i = 0; i < size; ++i) answer.push_back(std::to_integer<int>(output[i]));
    return answer;
  }
  static std::vector<int> request(int code, int flags) {
    std::vector<int> r(24, 0);
    r[0] = code;
    r[4] = flags;
    return r;
  }

  testing::TestHost device;
  Recordings recordings{device.host, device.codec};
  LinuxDriverRegistry registry{recordings};
  KdStatus status = 0;
};

TEST_F(DriversTest, AWalkIsNoLongerValidWhenTheRegistryChanged) {
  EXPECT_TRUE(registry.KdServiceMatching("C").isNone());
  put({dict({{"class", text("C")}})});
  KdHandle iterator = 0;
  ASSERT_EQ(registry.KdServiceGetMatchingServices(registry.KdServiceMatching("C"), iterator), 0);
  EXPECT_TRUE(registry.KdIteratorIsValid(iterator));
  put({});
  EXPECT_FALSE(registry.KdIteratorIsValid(iterator));
  EXPECT_EQ(registry.openHandles(), 1U);
  EXPECT_EQ(registry.KdObjectRelease(iterator), 0);
  EXPECT_EQ(registry.openHandles(), 0U);
}

TEST_F(DriversTest, AStorageClientTellsRequestsApartAndIsStrict) {
  device.put("/System/Device/list1.bin", "abcdef");
  device.put("/outside", "secret");
  const KdHandle connection = open(
      {{"buffers",
        PlistValue::array(
            {dict({{"method", number(9)}, {"code", number(13)}, {"data", bytes(6)}, {"fill", number(5)}}),
             dict({{"method", number(9)},
                   {"code", number(13)},
                   {"list", number(1)},
                   {"file", text("list1.bin")}}),
             dict({{"method", number(9)},
                   {"code", number(15)},
                   {"size", number(0xFFFFFFFF)},
                   {"data", bytes(1)}}),
             dict({{"method", number(9)},
                   {"code", number(16)},
                   {"sizeStatus", number(-536870206)},
                   {"dataStatus", number(3758097090)}}),
             dict({{"method", number(9)}, {"code", number(17)}, {"file", text("../../outside")}}),
             dict({{"method", number(8)}, {"data", bytes(7)}})})},
       {"recommendation", dict({{"method", number(5)}, {"data", bytes(2)}})},
       {"closeStatus", number(3)}});
  using Bytes = std::vector<int>;
  EXPECT_EQ(call(connection, 9, request(13, 1), 4), (Bytes{6, 0, 0, 0}));
  EXPECT_EQ(call(connection, 9, request(13, 0), 6).size(), 5U);
  EXPECT_EQ(call(connection, 9, request(13, 2), 3).size(),
            3U);  // the extended flag is the caller's; what fits is filled
  EXPECT_EQ(call(connection, 9, request(13, 4), 6), (Bytes{'a', 'b', 'c', 'd', 'e', 'f'}));
  EXPECT_EQ(call(connection, 9, request(15, 1), 4), (Bytes{255, 255, 255, 255}));
  EXPECT_EQ(call(connection, 8, {}, 4), (Bytes{7, 0, 0, 0}));
  EXPECT_EQ(call(connection, 8, {}, 7).size(), 7U);
  EXPECT_EQ(call(connection, 5, {}, 8).size(), 2U);
  EXPECT_EQ(call(connection, 9, request(16, 1), 4), Bytes{-536870206});
  EXPECT_EQ(call(connection, 9, request(16, 0), 9), Bytes{-536870206});
  auto reserved = request(13, 1);
  reserved[23] = 1;
  Bytes shortOne(23, 0);
  for (const auto& [method, bad, room] : {std::tuple{9U, reserved, 4UL},
                                          {9U, shortOne, 4UL},
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
}

TEST_F(DriversTest, OpeningCanFail) {
  EXPECT_EQ(open({{"openStatus", number(0xE00002C5)}}), 0U);
  EXPECT_EQ(status, static_cast<KdStatus>(0xE00002C5));
  EXPECT_EQ(registry.openHandles(), 0U);
}

}  // namespace
}  // namespace tbdaily

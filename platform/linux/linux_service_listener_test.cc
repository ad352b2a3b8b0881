// The endpoint under peers that are slow, many, large or hostile.
#include "platform/linux/linux_service_listener.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <csignal>
#include <ctime>
#include <thread>

#include "platform/byte_writer.h"
#include "platform/linux/host_test_support.h"
#include "platform/linux/unix_socket.h"

namespace tbdaily {
namespace {

constexpr const char* kEndpoint = "com.example.e";
constexpr std::size_t kMost = LinuxServiceListener::kMaximumMessageLength;

std::string frame(std::size_t length, std::string_view list) {
  std::string bytes;
  appendLittleEndian(bytes, length, 4);
  return bytes.append(list);
}

// A message that says `number`, with as much white space as makes it `length` bytes long.
std::string message(int number, std::size_t length = 0) {
  std::string list =
      "<plist><dict><key>n</key><integer>" + std::to_string(number) + "</integer></dict></plist>";
  if (list.size() < length) list.append(length - list.size(), '\n');
  return frame(list.size(), list);
}

struct EndpointTest : ::testing::Test {
  void SetUp() override {
    std::signal(SIGPIPE, SIG_IGN);  // as the job does
    const ServiceConnection endpoint = listener.createListener(kEndpoint, DeliveryQueue::Main);
    ASSERT_NE(endpoint, 0U);
    listener.setEventHandler(endpoint, [this](const ServiceEvent& event) {
      const ServiceConnection peer = event.peer;
      events.push_back("new " + std::to_string(peer));
      listener.setEventHandler(peer, [this, peer](const ServiceEvent& received) {
        const std::string who = std::to_string(peer) + " ";
        events.push_back(received.kind == ServiceEventKind::Error
                             ? who + "error"
                             : who + std::to_string(received.message.get("n").asInteger().value_or(0)));
      });
      listener.resume(peer);
    });
    listener.resume(endpoint);
  }
  FileDescriptor connect() {
    return connectUnixSocket(device.openFolder(kEndpointFolder), endpointSocketName(kEndpoint)).socket;
  }
  // Runs slices until that many events came and nothing comes any more, and answers the events.
  std::vector<std::string> serve(double quiet = 0.05, std::size_t atLeast = 0) {
    constexpr double kLongEnough = 60;  // on a slow machine, for events that are sure to come
    events.clear();
    while (events.size() < atLeast && listener.runSlice(kLongEnough) == SliceResult::HandledEvent) {
    }
    while (listener.runSlice(quiet) == SliceResult::HandledEvent) {
    }
    return events;
  }
  using Events = std::vector<std::string>;

  testing::TestHost device;
  LinuxServiceListener listener{device.host, device.codec};
  Events events;
};

TEST_F(EndpointTest, BelongsToOneListenerAndOnlyStaleSocketsAreReplaced) {
  LinuxServiceListener other(device.host, device.codec);
  EXPECT_EQ(other.createListener(kEndpoint, DeliveryQueue::Main), 0U);
  EXPECT_TRUE(connect().isOpen());  // the refused one left the socket alone
  device.put("/var/run/taken.sock", "a file");
  for (const char* name : {"", "../e", ".e", "taken"})
    EXPECT_EQ(other.createListener(name, DeliveryQueue::Main), 0U) << name;
  EXPECT_EQ(device.text("/var/run/taken.sock"), "a file");
  // Closing a bound socket leaves its file, as a job that was killed does.
  EXPECT_EQ(listenUnixSocket(device.openFolder(kEndpointFolder), "stale.sock").error, 0);
  EXPECT_NE(LinuxServiceListener(device.host, device.codec).createListener("stale", DeliveryQueue::Main), 0U);
  EXPECT_FALSE(device.openFolder(kEndpointFolder).has("stale.sock"));
}

TEST_F(EndpointTest, ReadsMessagesHoweverTheyArrive) {
  const FileDescriptor peer = connect();
  std::string all;
  for (int n = 1; n <= 50; ++n) all += message(n);
  ASSERT_EQ(writeAll(peer.get(), all), 0);
  Events expected{"new 2"};
  for (int n = 1; n <= 50; ++n) expected.push_back("2 " + std::to_string(n));
  EXPECT_EQ(serve(), expected);
  std::jthread trickle([&] {
    for (const char byte : message(51, 200)) {
      writeAll(peer.get(), std::string(1, byte));
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
  });
  EXPECT_EQ(listener.runSlice(0.1), SliceResult::TimedOut);  // a part of a message is no event
  EXPECT_EQ(serve(0.05, 1), Events{"2 51"});
}

TEST_F(EndpointTest, TakesSixteenMebibytesAndNoByteMore) {
  for (const std::size_t length : {kMost, kMost + 1}) {
    const FileDescriptor peer = connect();
    std::thread sender([&] { writeAll(peer.get(), message(7, length)); });
    const ServiceConnection id = length == kMost ? 2 : 3;
    const std::string who = std::to_string(id);
    EXPECT_EQ(serve(0.05, 2), (Events{"new " + who, who + (length == kMost ? " 7" : " error")}));
    sender.join();
  }
}

TEST_F(EndpointTest, GoesOnAfterEveryKindOfBadPeer) {
  const FileDescriptor good = connect();
  const std::string hostile[] = {
      frame(0, ""), frame(0xFFFFFFFF, "x"),  frame(6, "bplist"), frame(24, "<plist><array/></plist>\n"),
      "\1",         message(1).substr(0, 20)};
  Events expected{"new 2"};
  std::size_t errors = 0;
  EXPECT_EQ(serve(), expected);
  for (const std::string& bytes : hostile) {
    FileDescriptor peer = connect();
    ASSERT_EQ(writeAll(peer.get(), bytes), 0);
    peer.reset();
    for (const std::string& event : serve()) errors += event.ends_with(" error") ? 1U : 0U;
  }
  EXPECT_EQ(errors, std::size(hostile));
  connect();  // one that leaves without a word
  EXPECT_EQ(serve(), Events{"new 9"});
  ASSERT_EQ(writeAll(good.get(), message(5)), 0);
  EXPECT_EQ(serve(), Events{"2 5"});
}

TEST_F(EndpointTest, LetsPeersTakeTurns) {
  const FileDescriptor first = connect(), second = connect();
  EXPECT_EQ(serve().size(), 2U);
  for (int n = 1; n <= 3; ++n) {
    for (const FileDescriptor* peer : {&first, &second}) ASSERT_EQ(writeAll(peer->get(), message(n)), 0);
  }
  const FileDescriptor late = connect();
  const Events turns = serve();
  ASSERT_EQ(turns.size(), 7U);
  for (const char* event : {"2 1", "3 1", "new 4"})
    EXPECT_LT(std::ranges::find(turns, event) - turns.begin(), 3) << event;
}

TEST_F(EndpointTest, RestsWhenNoDescriptorIsLeftAndServesTheCrowdLater) {
  std::vector<FileDescriptor> crowd;
  for (int i = 0; i < 20; ++i) crowd.push_back(connect());
  const FileDescriptor lastFree(::dup(crowd.back().get()));
  {
    const testing::ResourceLimit none(RLIMIT_NOFILE, static_cast<rlim_t>(crowd.back().get()) + 1);
    const std::clock_t start = std::clock();
    EXPECT_EQ(listener.runSlice(0.4), SliceResult::TimedOut);
    EXPECT_LT(std::clock() - start, CLOCKS_PER_SEC / 10);  // it did not spin
  }
  EXPECT_EQ(serve().size(), crowd.size());
}

TEST_F(EndpointTest, GivesTheRoomOfIdlePeersToNewOnes) {
  std::vector<FileDescriptor> crowd;
  for (std::size_t i = 0; i < LinuxServiceListener::kMaximumPeers; ++i) {
    crowd.push_back(connect());
    if (i % 64 == 63) serve();
  }
  ASSERT_EQ(writeAll(crowd[0].get(), message(1)), 0);  // no longer the one that is idle longest
  EXPECT_EQ(serve(), Events{"2 1"});
  const FileDescriptor late = connect();
  ASSERT_EQ(writeAll(late.get(), message(7)), 0);
  ASSERT_EQ(writeAll(crowd[0].get(), message(2)), 0);
  Events seen = serve();
  std::ranges::sort(seen);
  EXPECT_EQ(seen, (Events{"2 2", "258 7", "new 258"}));
  char byte = 0;
  EXPECT_EQ(::read(crowd[1].get(), &byte, 1), 0);  // closed
}

TEST_F(EndpointTest, HoldsAtMostSixtyFourMebibytesOfUnfinishedMessages) {
  const std::string most = message(1, LinuxServiceListener::kMaximumMessageLength);
  std::vector<FileDescriptor> peers;
  for (int i = 0; i < 4; ++i) {
    peers.push_back(connect());
    const std::jthread writer(
        [&] { writeAll(peers.back().get(), std::string_view(most).substr(0, most.size() - 1)); });
    Events seen = serve(0.3);
    EXPECT_EQ(std::ranges::count(seen, "2 error"), i == 3 ? 1 : 0) << i;
  }
  ASSERT_EQ(writeAll(peers[3].get(), most.substr(most.size() - 1)), 0);
  EXPECT_EQ(serve(), Events{"5 1"});
}

}  // namespace
}  // namespace tbdaily

#include "platform/linux/linux_notifications.h"

#include <gtest/gtest.h>

#include <thread>

#include "platform/linux/host_test_support.h"

namespace tbdaily {
namespace {

using testing::TestHost;
using Names = std::vector<std::string>;

TEST(LinuxNotificationsTest, CountEveryPostOfSeveralThreads) {
  TestHost device;
  LinuxNotifications notifications(device.host);
  const auto post = [&] {
    for (int i = 0; i < 50; ++i) notifications.post("n");
  };
  std::thread other(post);
  post();
  other.join();
  EXPECT_EQ(device.text("/var/run/notifications/n"), "100\n");
  device.put("/var/run/notifications/n", "rubbish");
  for (const char* name : {"n", "../out", "", ".n"}) notifications.post(name);
  EXPECT_EQ(device.text("/var/run/notifications/n"), "1\n");
  EXPECT_EQ(device.names("/var/run"), (Names{"notifications", "notifications.lock"}));
  EXPECT_EQ(device.names("/var/run/notifications"), Names{"n"});
}

}  // namespace
}  // namespace tbdaily

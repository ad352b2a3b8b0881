#include "platform/linux/host_identity.h"

#include <gtest/gtest.h>

#include "platform/linux/host_test_support.h"
#include "platform/linux/os_release.h"

namespace tbdaily {
namespace {

TEST(HostIdentityTest, ReadsTextsAsTheirWritersMeantThem) {
  testing::TestHost device(true);
  EXPECT_EQ(osReleaseValue(device.host, "V"), std::nullopt);
  device.putLive("/usr/lib/os-release", "V=fallback\n");
  EXPECT_EQ(osReleaseValue(device.host, "V"), "fallback");
  const std::pair<const char*, const char*> cases[] = {{"V=plain", "plain"},
                                                       {"V=\"a b\"\n", "a b"},
                                                       {"V='a \"b'\n", "a \"b"},
                                                       {"V=\"a\\\"\\$b\"", "a\"$b"},
                                                       {"V=\"a\\nb\"", "a\\nb"},
                                                       {"V='a\\b'", "a\\b"},
                                                       {"V=a\\ b", "a b"},
                                                       {"V=", "-"},
                                                       {"V", "-"},
                                                       {"#V=c\nVV=d", "-"},
                                                       {"V=\"open", "open"},
                                                       {"V=first\nV=last\n", "last"},
                                                       {"V=a\\", "a\\"}};
  for (const auto& [file, value] : cases) {
    device.putLive("/etc/os-release", file);
    EXPECT_EQ(osReleaseValue(device.host, "V").value_or("-"), value) << file;
  }
  for (const char* bad :
       {"", "uninitialized\n", "0123456789ABCDEF0123456789abcdef", "0123456789abcdef0123456789abcde"}) {
    device.putLive("/etc/machine-id", bad);
    EXPECT_EQ(hashedMachineIdentifier(device.host), "") << bad;
  }
  EXPECT_EQ(hardwareModelName(device.host), "");
  device.putLive("/proc/device-tree/model", std::string("Board\0", 6));
  EXPECT_EQ(hardwareModelName(device.host), "Board");
  const std::string uuid = randomUuid();
  EXPECT_TRUE(uuid.size() == 36 && uuid[14] == '4' &&
              std::string_view("89AB").find(uuid[19]) != std::string::npos)
      << uuid;
}

}  // namespace
}  // namespace tbdaily

#include "platform/linux/linux_kernel.h"

#include <gtest/gtest.h>

#include "platform/kernel.h"
#include "platform/linux/host_test_support.h"
#include "platform/platform.h"
#include "platform/plist_text.h"

namespace tbdaily {
namespace {

using testing::TestPlatform;

TEST(LinuxKernelTest, FillsSysctlsFromIntegersErrorsAndEvents) {
  TestPlatform device;
  Kernel& kernel = device.services.kernel;
  const auto read = [&](const char* name, std::size_t room) {
    PlistData buffer(room);
    std::size_t length = room;
    const int error = kernel.sysctlByName(name, buffer, length);
    if (error != 0) return "errno " + std::to_string(error);
    buffer.resize(length);
    return plistText(PlistValue::data(buffer));
  };
  device.record("kernel.plist", "sysctl", testing::plistOf(R"({"int": -2, "text": "x", "bad": "x"})"));
  device.record(
      "kernel.plist", "eccEvents",
      PlistValue::array({PlistValue::data(PlistData(3, std::byte{1})), PlistValue::data(PlistData(1))}));
  const auto setErrors = [&](const std::string& number) {
    device.record("kernel.plist", "errno",
                  testing::plistOf(R"({"bad": )" + number + R"(, "kern.next_ecc_event": )" + number + "}"));
  };
  setErrors("5");
  const std::tuple<const char*, std::size_t, const char*> answers[] = {{"int", 4, "<feffffff>"},
                                                                       {"int", 8, "<feffffffffffffff>"},
                                                                       {"int", 5, "errno 22"},
                                                                       {"text", 8, "errno 2"},
                                                                       {"bad", 8, "errno 5"},
                                                                       {"vm.swapusage", 32, "errno 2"},
                                                                       {"kern.next_ecc_event", 8, "<010101>"},
                                                                       {"kern.next_ecc_event", 8, "<00>"},
                                                                       {"kern.next_ecc_event", 8, "errno 5"}};
  for (const auto& [name, room, answer] : answers) EXPECT_EQ(read(name, room), answer) << name << room;
  setErrors("1099511627776");  // no error number
  EXPECT_EQ(read("kern.next_ecc_event", 8), "errno 2");

  // A day is not guessed: a clock that cannot be read stands still where it was, or there is no time.
  TestPlatform unreadable(true);
  const auto clock = unreadable.host.files().place("/System/Device/clock.plist");
  std::filesystem::create_directories(clock);
  EXPECT_THROW(unreadable.services.kernel.currentTime(), std::runtime_error);
  std::filesystem::remove(clock);
  unreadable.record("clock.plist", "now", PlistValue(PlistDate{5}));
  EXPECT_EQ(unreadable.services.kernel.currentTime().secondsSinceReference, 5);
  std::filesystem::remove(clock);
  std::filesystem::create_directories(clock);
  EXPECT_EQ(unreadable.services.kernel.currentTime().secondsSinceReference, 5);

  TestPlatform live(true);
  live.record("clock.plist", "numerator", testing::plistOf("4294967296"));
  EXPECT_EQ(live.services.kernel.timebase()->numerator, 1U);
}

}  // namespace
}  // namespace tbdaily

#include "platform/linux/linux_preferences.h"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <thread>

#include "platform/linux/host_test_support.h"
#include "platform/plist_text.h"
#include "testing/binary_plist_builder.h"

namespace tbdaily {
namespace {

namespace fs = std::filesystem;
using namespace std::string_literals;
using testing::TestHost;
using Names = std::vector<std::string>;
constexpr const char* kPreferences = "/var/mobile/Library/Preferences/";

struct PreferencesTest : ::testing::Test {
  std::string path(const char* name) { return std::string(kPreferences) + name; }
  TestHost device;
  LinuxPreferences preferences{device.host, device.codec};
};

TEST_F(PreferencesTest, LoseNoUpdateBetweenThreadsAndProcesses) {
  constexpr int kWriters = 3, kRounds = 40;
  const auto write = [this](int writer) {
    LinuxPreferences own(device.host, device.codec);
    const std::string key = "writer " + std::to_string(writer);
    for (int round = 1; round <= kRounds; ++round) {
      own.setValue(key, PlistValue::int64(own.getInteger(key, "d") + 1), "d");
      own.setValue(key + " passing", round % 2 == 0 ? PlistValue() : PlistValue::boolean(true), "d");
    }
  };
  const pid_t process = ::fork();
  if (process == 0) {
    write(0);
    ::_exit(0);
  }
  std::thread second(write, 1), third(write, 2);
  second.join();
  third.join();
  ASSERT_EQ(::waitpid(process, nullptr, 0), process);
  for (int writer = 0; writer < kWriters; ++writer) {
    const std::string key = "writer " + std::to_string(writer);
    EXPECT_EQ(preferences.getInteger(key, "d"), kRounds) << key;
    EXPECT_TRUE(preferences.getValue(key + " passing", "d").isNone());
  }
  EXPECT_EQ(device.names(kPreferences), (Names{"d.plist", "d.plist.lock"}));
}

TEST_F(PreferencesTest, MoveDamagedFilesAsideAndNeverOverwriteThem) {
  for (const char* damaged : {"<plist><dict><key>k", "", "<plist><array/></plist>"}) {
    device.put(path("d.plist"), damaged);
    EXPECT_TRUE(preferences.getValue("k", "d").isNone());
    EXPECT_EQ(device.text(path("d.plist")), damaged);
    preferences.setValue("k", PlistValue::int64(1), "d");
    EXPECT_EQ(preferences.getInteger("k", "d"), 1);
  }
  EXPECT_EQ(device.text(path("d.plist.damaged-0")), "<plist><dict><key>k");
  EXPECT_EQ(device.text(path("d.plist.damaged-2")), "<plist><array/></plist>");
  fs::create_directories(device.host.files().place(path("folder.plist")));
  preferences.setValue("k", PlistValue::int64(1), "folder");
  EXPECT_TRUE(preferences.getValue("k", "folder").isNone());
  EXPECT_TRUE(fs::is_directory(device.host.files().place(path("folder.plist"))));
}

TEST_F(PreferencesTest, KeepADomainWithTextThatXmlCannotCarry) {
  using Builder = testing::BinaryPlistBuilder;
  Builder list;
  for (const std::string& object : {Builder::dictionary({1, 2}, {3, 4}), Builder::ascii("odd"),
                                    Builder::ascii("good"), Builder::ascii("a\x01"), Builder::ascii("g")})
    list.add(object);
  device.put(path("d.plist"), list.build());
  preferences.applyChanges(std::vector<PreferenceChange>{{"k", PlistValue::string("\x01"), "d"},
                                                         {"n", PlistValue::int64(2), "d"}});
  EXPECT_EQ(plistText(device.parse(device.text(path("d.plist")))),
            "{\"odd\": \"a\uFFFD\", \"good\": \"g\", \"k\": \"\uFFFD\", \"n\": 2}");
}

TEST_F(PreferencesTest, TouchNoFileForAHostileDomain) {
  device.put("/var/mobile/Library/secret.plist", "x");
  for (const std::string& domain :
       {"../secret"s, "a/b"s, ".hidden"s, ""s, std::string(201, 'a'), "a b"s, "a\0b"s, "\xC3\xA9"s, ".."s}) {
    preferences.setValue("k", PlistValue::int64(1), domain);
    preferences.synchronize(domain);
    EXPECT_TRUE(preferences.getValue("k", domain).isNone());
  }
  preferences.setValue("k", PlistValue(), "absent");
  EXPECT_EQ(device.names("/var/mobile/Library"), Names{"secret.plist"});
  preferences.setValue("k", PlistValue::int64(1), std::string(200, 'a'));
  EXPECT_EQ(preferences.getInteger("k", std::string(200, 'a')), 1);
}

TEST_F(PreferencesTest, ReadFilesOfOthersAndWriteTheExactForm) {
  device.put(path("d.plist"), "<plist><dict><key>k</key><integer>8</integer></dict></plist>");
  EXPECT_EQ(preferences.getValue("k", "d"), PlistValue::int64(8));
  preferences.setValue("date", PlistValue(PlistDate{0.5}), "d");
  preferences.setValue("n", PlistValue::int8(3), "d");
  preferences.setValue("k", PlistValue(), "d");
  EXPECT_NE(device.text(path("d.plist")).find("<integer bits=\"8\">3</integer>"), std::string::npos);
  EXPECT_EQ(plistText(device.parse(device.text(path("d.plist")))),
            R"({"date": 2001-01-01 00:00:00 +0000, "n": 3})");
}

}  // namespace
}  // namespace tbdaily

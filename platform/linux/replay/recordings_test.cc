#include "platform/linux/replay/recordings.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "platform/linux/host_test_support.h"
#include "platform/platform.h"

namespace tbdaily {
namespace {

namespace fs = std::filesystem;
using testing::bundleTypes;
using testing::joined;
using testing::TestPlatform;
using Texts = std::vector<std::string>;

PlistValue text(const char* t) {
  return PlistValue::string(t);
}

TEST(RecordingsTest, AnswerBeforeTheLiveHostEachForItself) {
  TestPlatform device(true);
  device.putLive("/etc/os-release", "BUILD_ID=b\nVERSION_ID=12\nPRETTY_NAME=\"Some OS 12\"\n");
  device.putLive("/etc/machine-id", "0123456789abcdef0123456789abcdef\n");
  device.putLive("/sys/class/dmi/id/product_name", "Board 7 \n");
  device.putLive("/usr/share/locale/pt_BR/x", "");
  device.putLive("/usr/share/locale/ca@valencia/x", "");
  device.putLive("/usr/share/applications/a.desktop", "[Desktop Entry]\nType=Application\n");
  ::setenv("LC_ALL", "de_AT.UTF-8@euro", 1);
  ::setenv("LANGUAGE", "fr:de_AT::C", 1);
  const auto answers = [&device] {
    Platform& p = device.services;
    return Texts{p.deviceAnswers.currentOSBuildVersion().value_or("-"),
                 p.logSubmission.currentOSVersion(),
                 p.logSubmission.systemVersion(),
                 p.logSubmission.systemIdentifier(),
                 p.logSubmission.hardwareModel(),
                 joined(p.localeSettings.preferredLanguages()),
                 joined(p.localeSettings.systemLanguages()),
                 p.localeSettings.countryCode().value_or("-"),
                 bundleTypes(p),
                 std::string(p.deviceAnswers.copyAnswer("DiskUsage").asString().value_or("live")),
                 std::to_string(p.deviceAnswers.multiUserMode().value_or(false))};
  };
  // The keyed hash was computed with another implementation.
  const Texts live{"b",       "12",        "Some OS 12", "2224bb468643497eb065e4d7b56562ed",
                   "Board 7", "fr de-AT ", "pt-BR ",     "AT",
                   "System ", "live",      "0"};
  struct Case {
    std::string_view file, key, recorded;
    const char* answer;
  };
  const Case cases[] = {{"answers.plist", "ProductBuildVersion", "\"r\"", "r"},
                        {"answers.plist", "ProductVersion", "\"r\"", "r"},
                        {"answers.plist", "SystemVersion", "\"r\"", "r"},
                        {"answers.plist", "SystemIdentifier", "\"r\"", "r"},
                        {"answers.plist", "HardwareModel", "\"r\"", "r"},
                        {"locale.plist", "preferredLanguages", R"(["xx", 1, "yy"])", "xx yy "},
                        {"locale.plist", "systemLanguages", R"(["xx", 1, "yy"])", "xx yy "},
                        {"locale.plist", "countryCode", "\"XX\"", "XX"},
                        {"apps.plist", "bundles", R"([{"type": "T"}, "no bundle"])", "T "},
                        {"answers.plist", "DiskUsage", "\"r\"", "r"},
                        {"answers.plist", "MultiUser", "true", "1"}};
  EXPECT_EQ(answers(), live);
  for (std::size_t i = 0; i < live.size(); ++i) {
    Texts expected = live;
    expected[i] = cases[i].answer;
    device.record(cases[i].file, cases[i].key, testing::plistOf(cases[i].recorded));
    EXPECT_EQ(answers(), expected) << cases[i].key;
    const bool takesEveryKind = cases[i].key == "DiskUsage";
    device.record(cases[i].file, cases[i].key, takesEveryKind ? PlistValue() : PlistValue::int64(5));
    EXPECT_EQ(answers(), live) << cases[i].key;
  }
  ::unsetenv("LC_ALL");
  ::unsetenv("LANGUAGE");
}

TEST(RecordingsTest, AreReadAgainWhenTheyChangeOrCouldNotBeRead) {
  TestPlatform device;
  const auto build = [&] { return device.services.deviceAnswers.currentOSBuildVersion().value_or("-"); };
  for (const char* sameLength : {"1", "2", "3", "4"}) {
    device.record("answers.plist", "ProductBuildVersion", text(sameLength));
    EXPECT_EQ(build(), sameLength);
  }
  device.put("/System/Device/answers.plist", "<plist><dict>");
  EXPECT_EQ(build(), "-");
  const fs::path place = device.host.files().place("/System/Device/answers.plist");
  fs::remove(place);
  fs::create_directory(place);
  EXPECT_EQ(build(), "-");
  fs::remove(place);
  device.record("answers.plist", "ProductBuildVersion", text("x"));
  device.services.preferences.setValue("k", text("v"), "d");

  LinuxPlatform late(device.host);
  {
    const testing::ResourceLimit none(RLIMIT_NOFILE, 0);  // no descriptor is to be had for a moment
    EXPECT_FALSE(late.services().deviceAnswers.currentOSBuildVersion());
    EXPECT_TRUE(late.services().preferences.getValue("k", "d").isNone());
  }
  EXPECT_EQ(late.services().deviceAnswers.currentOSBuildVersion(), "x");
  EXPECT_EQ(late.services().preferences.getValue("k", "d"), text("v"));
}

}  // namespace
}  // namespace tbdaily

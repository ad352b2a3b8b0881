// Recordings before the live host; the answers of each family that reads.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "platform/linux/host_identity.h"
#include "platform/linux/host_test_support.h"
#include "platform/linux/os_release.h"
#include "platform/plist_text.h"
#include "testing/fake_platform.h"  // for the interfaces of all families

namespace tbdaily {
namespace {

namespace fs = std::filesystem;
using namespace std::string_literals;
using testing::TestPlatform;
using Texts = std::vector<std::string>;

PlistValue text(const char* t) {
  return PlistValue::string(t);
}

std::string joined(const Texts& texts) {
  std::string all;
  for (const std::string& t : texts) all += t + " ";
  return all;
}

std::string bundleTypes(Platform& host) {
  Texts types;
  host.appRegistry.enumerateBundles(BundleKind::Application,
                                    [&](std::string_view t) { types.emplace_back(t); });
  std::ranges::sort(types);
  return joined(types);
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
    device.record(cases[i].file, cases[i].key, device.json(cases[i].recorded));
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
  const fs::path place = device.host.devicePath("/System/Device/answers.plist");
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
  device.record("kernel.plist", "sysctl", device.json(R"({"int": -2, "text": "x", "bad": "x"})"));
  device.record(
      "kernel.plist", "eccEvents",
      PlistValue::array({PlistValue::data(PlistData(3, std::byte{1})), PlistValue::data(PlistData(1))}));
  const auto setErrors = [&](const std::string& number) {
    device.record("kernel.plist", "errno",
                  device.json(R"({"bad": )" + number + R"(, "kern.next_ecc_event": )" + number + "}"));
  };
  setErrors("5");
  EXPECT_EQ(read("int", 4), "<feffffff>");
  EXPECT_EQ(read("int", 8), "<feffffffffffffff>");
  EXPECT_EQ(read("int", 5), "errno 22");
  EXPECT_EQ(read("text", 8), "errno 2");
  EXPECT_EQ(read("bad", 8), "errno 5");
  EXPECT_EQ(read("vm.swapusage", 32), "errno 2");
  EXPECT_EQ(read("kern.next_ecc_event", 8), "<010101>");
  EXPECT_EQ(read("kern.next_ecc_event", 8), "<00>");
  EXPECT_EQ(read("kern.next_ecc_event", 8), "errno 5");
  setErrors("1099511627776");  // no error number
  EXPECT_EQ(read("kern.next_ecc_event", 8), "errno 2");

  TestPlatform live(true);
  live.record("clock.plist", "numerator", device.json("4294967296"));
  EXPECT_EQ(live.services.kernel.timebase()->numerator, 1U);
}

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

TEST(LinuxAppRegistryTest, CountsTheApplicationsAmongTheDesktopEntries) {
  TestPlatform device(true);
  const std::string application = "[Desktop Entry]\nName=a\nType = Application \r\n[Other]\nHidden=true\n";
  const std::string shared = "/usr/share/applications/", own = "/home/me/.local/share/applications/";
  for (const std::string& place :
       {shared + "a.desktop", shared + "a.desktop.bak", "/usr/local/share/applications/c.desktop"s,
        "/var/lib/flatpak/exports/share/applications/d.desktop"s, own + "e.desktop", own + "huge.desktop"})
    device.putLive(place, application);
  device.putLive(shared + "kde/b.desktop", "# c\n\n" + application);
  device.putLive(shared + "link.desktop", "[Desktop Entry]\nType=Link\n");
  device.putLive(shared + "hidden.desktop", "[Desktop Entry]\nType=Application\nHidden=true");
  device.putLive(shared + "late.desktop", "[Other]\nType=Application\n");
  fs::resize_file(device.host.livePath(own + "huge.desktop"), std::uintmax_t{1} << 40);
  ASSERT_EQ(::mkfifo(device.host.livePath(own + "pipe.desktop").c_str(), 0600), 0);
  EXPECT_EQ(bundleTypes(device.services), "System System User User User ");
}

TEST(LinuxDynamicLoaderTest, RefusesWhatOthersCanWrite) {
  TestPlatform device;
  const fs::path folder = device.host.devicePath("/lib"), library = folder / "Support";
  fs::create_directory(folder);
  fs::copy_file(SUPPORT_LIBRARY, library);
  const auto opens = [&](const char* path) { return device.services.dynamicLoader.open(path) != nullptr; };
  for (const auto& [place, mode] :
       {std::pair(library, 0722U), {library, 0702U}, {folder, 0720U}, {folder, 0707U}}) {
    fs::permissions(place, static_cast<fs::perms>(mode));
    EXPECT_FALSE(opens("/lib/Support")) << place << mode;
    fs::permissions(place, static_cast<fs::perms>(0700));
  }
  if (::geteuid() == 0) {
    ASSERT_EQ(::chown(library.c_str(), 4711, 0), 0);
    EXPECT_FALSE(opens("/lib/Support"));
    ASSERT_EQ(::chown(library.c_str(), 0, 0), 0);
  }
  fs::create_directory(device.host.devicePath("/open"));
  fs::permissions(device.host.devicePath("/open"), static_cast<fs::perms>(0777));
  fs::create_symlink(library, device.host.devicePath("/open/link"));
  EXPECT_FALSE(opens("/open/link"));
  fs::create_symlink(library, folder / "link");
  EXPECT_TRUE(opens("/lib/link"));
  ASSERT_EQ(::mkfifo((folder / "pipe").c_str(), 0600), 0);
  EXPECT_FALSE(opens("/lib/pipe"));  // and does not wait for a writer
  EXPECT_FALSE(opens("/lib"));
}

}  // namespace
}  // namespace tbdaily

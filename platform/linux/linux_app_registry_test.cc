#include "platform/linux/linux_app_registry.h"

#include <gtest/gtest.h>

#include "platform/app_registry.h"
#include "platform/linux/host_test_support.h"
#include "platform/platform.h"

namespace tbdaily {
namespace {

namespace fs = std::filesystem;
using namespace std::string_literals;
using testing::bundleTypes;
using testing::TestPlatform;

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

}  // namespace
}  // namespace tbdaily

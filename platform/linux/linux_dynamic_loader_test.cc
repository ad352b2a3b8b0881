#include "platform/linux/linux_dynamic_loader.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "platform/dynamic_loader.h"
#include "platform/linux/host_test_support.h"
#include "platform/platform.h"

namespace tbdaily {
namespace {

namespace fs = std::filesystem;
using testing::TestPlatform;

TEST(LinuxDynamicLoaderTest, RefusesWhatOthersCanWrite) {
  TestPlatform device;
  const fs::path folder = device.host.files().place("/lib"), library = folder / "Support";
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
  fs::create_directory(device.host.files().place("/open"));
  fs::permissions(device.host.files().place("/open"), static_cast<fs::perms>(0777));
  fs::create_symlink("/lib/Support", device.host.files().place("/open/link"));
  EXPECT_FALSE(opens("/open/link"));
  fs::create_symlink("../lib/Support", folder / "link");
  EXPECT_TRUE(opens("/lib/link"));
  ASSERT_EQ(::mkfifo((folder / "pipe").c_str(), 0600), 0);
  EXPECT_FALSE(opens("/lib/pipe"));  // and does not wait for a writer
  EXPECT_FALSE(opens("/lib"));
}

}  // namespace
}  // namespace tbdaily

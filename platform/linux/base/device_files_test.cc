// The door to the device's files: links, odd files, second names, and what is left behind.
#include "platform/linux/base/device_files.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fstream>

#include "platform/linux/base/passing_file.h"
#include "testing/temporary_folder.h"

namespace tbdaily {
namespace {

namespace fs = std::filesystem;

class DeviceFilesTest : public ::testing::Test {
 protected:
  DeviceFilesTest() {
    fs::create_directories(root / "var/mobile");
    put("var/mobile/own", "own");
    std::ofstream(folder.path() / "secret") << "secret";
  }
  void put(const fs::path& place, std::string_view text) const { std::ofstream(root / place) << text; }
  // The text, or the error in words.
  std::string read(std::string_view path) const {
    FileContents contents;
    const int error = files.readFile(path, contents);
    if (error != 0) return "error " + std::to_string(error);
    return {reinterpret_cast<const char*>(contents.bytes.data()), contents.bytes.size()};
  }
  static std::string error(int number) { return "error " + std::to_string(number); }
  DeviceFolder open(std::string_view path) const {
    DeviceFolder opened;
    EXPECT_EQ(files.makeFolder(path, opened), 0);
    return opened;
  }

  testing::TemporaryFolder folder;
  const fs::path root = folder.path() / "root";
  const DeviceFiles files{root};
};

TEST_F(DeviceFilesTest, FollowsOwnLinksInsideTheRootAlone) {
  fs::create_symlink("/var/mobile", root / "absolute");  // of the device, not of the host
  fs::create_symlink("../../../../var/mobile", root / "var/up");
  fs::create_symlink(folder.path() / "secret", root / "out");
  fs::create_symlink("circle", root / "circle");
  EXPECT_EQ(read("/absolute/own") + read("/var/up/own") + read("/../../var/mobile/own"), "ownownown");
  EXPECT_EQ(read("/out"), error(ENOENT));
  EXPECT_EQ(read("/../secret"), error(ENOENT));
  EXPECT_EQ(read("/circle"), error(ELOOP));
  EXPECT_EQ(read("/var/mobile"), error(kNotARegularFile));
  FileContents contents;
  EXPECT_EQ(files.readFileBelow("/var/mobile", "own", contents), 0);
  fs::create_symlink("/out", root / "var/mobile/leads");
  put("var/outside", "x");
  fs::create_symlink("../outside", root / "var/mobile/aside");
  EXPECT_EQ(files.readFileBelow("/var/mobile", "../outside", contents), kOutside);
  EXPECT_EQ(files.readFileBelow("/var/mobile", "aside", contents), kOutside);
  if (::geteuid() != 0) return;
  ASSERT_EQ(::lchown((root / "absolute").c_str(), 4711, 4711), 0);
  EXPECT_EQ(read("/absolute/own"), error(kForeignLink));
}

TEST_F(DeviceFilesTest, WritesRegularFilesWithoutASecondNameAlone) {
  const DeviceFolder mobile = open("/var/mobile");
  const fs::path place = root / "var/mobile";
  fs::create_symlink(folder.path() / "secret", place / "link");
  fs::create_hard_link(folder.path() / "secret", place / "second");
  ASSERT_EQ(::mkfifo((place / "pipe").c_str(), 0600), 0);
  fs::create_directory(place / "folder");
  for (const auto& [name, refusal] :
       {std::pair("link", int{kLinkInPlace}), {"pipe", kNotARegularFile}, {"folder", kNotARegularFile}}) {
    FileDescriptor file;
    EXPECT_EQ(mobile.replaceFile(name, "x"), refusal) << name;
    EXPECT_EQ(mobile.openForAppending(name, file), refusal) << name;
    EXPECT_EQ(mobile.openForReading(name, file), refusal) << name;
    EXPECT_FALSE(file.isOpen()) << name;
  }
  FileDescriptor file;
  EXPECT_EQ(mobile.openForAppending("second", file), kSecondName);
  EXPECT_EQ(mobile.replaceFile("second", "x"), 0);  // another file takes the name
  std::string secret;
  std::getline(std::ifstream(folder.path() / "secret"), secret);
  EXPECT_EQ(secret, "secret");
}

TEST_F(DeviceFilesTest, StaysInTheFolderThatWasOpenedWhenNamesAreExchanged) {
  const DeviceFolder mobile = open("/var/mobile");
  fs::rename(root / "var/mobile", root / "var/moved");
  fs::create_symlink(folder.path(), root / "var/mobile");
  EXPECT_EQ(mobile.replaceFile("new", "text"), 0);
  EXPECT_TRUE(fs::exists(root / "var/moved/new"));
  EXPECT_FALSE(fs::exists(folder.path() / "new"));
}

TEST_F(DeviceFilesTest, RemovesWhatKilledWritersLeftAndNothingElse) {
  const DeviceFolder mobile = open("/var/mobile");
  put("var/mobile/.tmp-99999999-1", "of a process that is gone");
  put("var/mobile/.tmp-abcdef", "of nobody");
  TemporaryFile beingWritten;
  ASSERT_EQ(beingWritten.create(mobile), 0);
  EXPECT_EQ(removePassingFiles(mobile).size(), 2U);
  EXPECT_EQ(beingWritten.replace("done"), 0);
  EXPECT_TRUE(fs::exists(root / "var/mobile/done"));
  EXPECT_FALSE(fs::exists(root / "var/mobile/.tmp-abcdef"));
}

TEST_F(DeviceFilesTest, GivesWhatRootMakesToTheOwnerAround) {
  if (::geteuid() != 0) GTEST_SKIP() << "for root alone";
  ASSERT_EQ(::chown((root / "var/mobile").c_str(), 4711, 4712), 0);
  ASSERT_EQ(::chown((root / "var/mobile/own").c_str(), 4713, 4714), 0);
  const DeviceFolder made = open("/var/mobile/a/b");
  EXPECT_EQ(made.replaceFile("new", "x"), 0);
  EXPECT_EQ(open("/var/mobile").replaceFile("own", "x"), 0);
  const auto owner = [&](const char* name) {
    struct stat status {};
    EXPECT_EQ(::stat((root / "var/mobile" / name).c_str(), &status), 0) << name;
    return std::pair(status.st_uid, status.st_gid);
  };
  for (const char* name : {"a", "a/b", "a/b/new"}) EXPECT_EQ(owner(name), std::pair(4711U, 4712U)) << name;
  EXPECT_EQ(owner("own"), std::pair(4713U, 4714U));
}

}  // namespace
}  // namespace tbdaily

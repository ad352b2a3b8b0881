#include "tools/tallyctl/default_root.h"

#include <gtest/gtest.h>

#include <fstream>

#include "testing/temporary_folder.h"

namespace tbdaily::testing {
namespace {

TEST(DefaultRootTest, IsTheLastLineThatNamesIt) {
  const auto root = [](std::string_view text) { return valueFromDefaults(text, "TBDAILY_ROOT"); };
  EXPECT_EQ(root(""), std::nullopt);
  EXPECT_EQ(root("TBDAILY_ROOT=/a\n  TBDAILY_ROOT = /b # c \nTBDAILY_ROOTS=/x"), "/b # c");
  EXPECT_EQ(root("#TBDAILY_ROOT=/a\n; TBDAILY_ROOT=/b\nTBDAILY_LIVE=0\n=\n"), std::nullopt);
  EXPECT_EQ(root("TBDAILY_ROOT=\"/my device\\\"s\" # it\r\n"), "/my device\"s");
  EXPECT_EQ(root("TBDAILY_ROOT='/a\\b'"), "/a\\b");
  EXPECT_EQ(root("TBDAILY_ROOT=/a\nTBDAILY_ROOT=\n"), std::nullopt);
}

TEST(DefaultRootTest, AFileThatCannotBeReadIsNoFileThatIsMissing) {
  const TemporaryFolder folder;
  EXPECT_EQ(rootFromDefaults(folder.path() / "none"), std::nullopt);
  EXPECT_THROW(rootFromDefaults(folder.path()), std::runtime_error);
  std::ofstream(folder.path() / "file") << "TBDAILY_ROOT=/r";
  EXPECT_EQ(rootFromDefaults(folder.path() / "file"), "/r");
}

}  // namespace
}  // namespace tbdaily::testing

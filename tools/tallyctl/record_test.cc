#include "tools/tallyctl/record.h"

#include <gtest/gtest.h>

#include "platform/linux/store/sqlite_analytics_history.h"
#include "testing/analytics_lines.h"
#include "testing/temporary_folder.h"

namespace tbdaily {
namespace {

using testing::Lines;

struct RecordTest : ::testing::Test {
  std::optional<std::string> import(const std::string& text) {
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> input(std::tmpfile(), &std::fclose);
    std::fwrite(text.data(), 1, text.size(), input.get());
    std::rewind(input.get());
    return recordImport(
        store, input.get(), [this](std::uint64_t bytes) { bytesRead = bytes; }, imported);
  }
  std::unique_ptr<OpenAnalyticsHistory> history() {
    return SqliteAnalyticsHistory([this] { return std::optional(place); }).open();
  }

  testing::TemporaryFolder folder;
  const DeviceFiles files{folder.path()};
  const StorePlace place = storePlaceOf(files, "/store");
  AnalyticsStore store{place};
  ImportedRows imported;
  std::uint64_t bytesRead = 0;
};

TEST_F(RecordTest, ImportsLinesOfBothKindsAndOfAllLengths) {
  std::string text =
      "s\tk\t-1\t-9223372036854775808\n\r\n\n"
      "d\tk\t3\t86399\t1e2\r\n"
      "d\tother\t3\t0\tnan\n"
      "d\tk\t3\t0\t-7\n";
  Lines expected;
  for (int i = 100; i < 1000; ++i) {  // several times what the buffer holds
    const std::string key = std::to_string(i) + std::string(static_cast<std::size_t>(i), 'k');
    text += "s\t" + key + "\t1\t" + std::to_string(i) + "\r\n";
    expected.push_back(key + " 1 " + std::to_string(i));
  }
  text += "s\tk\t-1\t4";
  expected.push_back("k -1 4");
  EXPECT_EQ(import(text), std::nullopt);
  EXPECT_EQ(bytesRead, text.size());
  EXPECT_EQ(imported.scalars, 902U);
  EXPECT_EQ(imported.distributionValues, 3U);
  EXPECT_EQ(testing::scalarLines(*history()), expected);
  EXPECT_EQ(testing::distributionLines(*history()), (Lines{"k 3: 100 -7", "other 3: nan"}));
}

TEST_F(RecordTest, NamesABadLineAndLoadsNothing) {
  std::vector<std::string> bad{"s\t" + std::string(70000, 'k') + "\t1\t1", "s\t" + std::string(2000000, 'k'),
                               std::string("s\tk\t1\t1\0", 9), std::string("s\tk\0\t1\t1", 9)};
  std::istringstream others(
      "s\tk\t1|s\tk\t1\t2\t3|d\tk\t1\t2|d\tk\t1\t2\t3\t4|x\tk\t1\t2| |s\t\t1\t1|s\t\xFF\t1\t1|"
      "s\tk\t2147483648\t1|s\tk\t1\t9223372036854775808|s\tk\t1\t 1|s\tk\t1\t1.5|"
      "d\tk\t1\t86400\t1|d\tk\t1\t-1\t1|d\tk\t1\t0\tinf|d\tk\t1\t0\t1e999|d\tk\t1\t0\t");
  for (std::string line; std::getline(others, line, '|');) bad.push_back(line);
  ASSERT_EQ(recordScalar(store, "kept", 1, 1, ScalarChange::Set), std::nullopt);
  for (const std::string& line : bad) {
    const auto failure = import("s\tfirst\t1\t1\n\nd\tfirst\t1\t0\t1\n" + line + "\ns\tlast\t1\t1\n");
    EXPECT_EQ(failure.value_or("").substr(0, 8), "line 4: ") << line.substr(0, 80);
    EXPECT_EQ(imported.scalars, 0U);
  }
  EXPECT_EQ(testing::scalarLines(*history()), Lines{"kept 1 1"});
  EXPECT_EQ(testing::distributionLines(*history()), Lines{});
}

TEST_F(RecordTest, RecordsSingleRowsAtTheirTime) {
  const PlistDate now = PlistDate::fromUnixSeconds(86400.0 * 5 + 61.9);
  EXPECT_EQ(recordTime(now, std::nullopt).secondsInDay, 61);
  EXPECT_TRUE(recordTime(now, 4).day == 4 && recordTime(now, 4).secondsInDay == 0);
  const std::vector<double> values{1, std::nan("")};
  EXPECT_EQ(recordDistribution(store, "k", recordTime(now, std::nullopt), values), std::nullopt);
  EXPECT_NE(recordDistribution(store, "k", {}, {{HUGE_VAL}}), std::nullopt);
  EXPECT_NE(recordScalar(store, "", 5, 2, ScalarChange::Set), std::nullopt);
  EXPECT_EQ(testing::distributionLines(*history()), Lines{"k 5: 1 nan"});
}

}  // namespace
}  // namespace tbdaily

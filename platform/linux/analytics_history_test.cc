#include "platform/linux/analytics_history.h"

#include <gtest/gtest.h>

#include <fstream>

#include "platform/linux/analytics_store.h"
#include "platform/linux/test_host.h"
#include "testing/analytics_contract.h"
#include "testing/fake_services.h"

namespace tbdaily {
namespace {

namespace fs = std::filesystem;
using testing::Lines;

class StoredAnalytics : public testing::TestPlatform {
 public:
  void setToday(PlistDate now) { setClock(now.unixSeconds()); }
  void addScalar(std::string_view key, DayNumber day, std::int64_t value) {
    EXPECT_TRUE(store.setScalar(key, day, value).ok());
  }
  void addDistribution(std::string_view key, DayNumber day, const std::vector<double>& values) {
    EXPECT_TRUE(store.appendDistributionValues(key, day, 0, values).ok());
  }
  // What another program does to the file.
  void sql(const char* statements) {
    SqliteDatabase database;
    ASSERT_EQ(database.open(store.file(), SqliteMode::ReadWrite, kStoreBusyTimeout), 0);
    ASSERT_EQ(database.execute(statements), 0) << database.errorMessage();
  }

  AnalyticsStore store{host.devicePath("/var/mobile/Library/Tallybook/TBDataStore.sqlitedb")};
};

}  // namespace

namespace testing {
INSTANTIATE_TYPED_TEST_SUITE_P(Stored, AnalyticsContract, StoredAnalytics);
INSTANTIATE_TYPED_TEST_SUITE_P(Stored, AnalyticsClientContract, StoredAnalytics);
}  // namespace testing

namespace {

TEST(LinuxAnalyticsHistory, PassesOverWhatAForeignProgramLeft) {
  StoredAnalytics history;
  history.addScalar("good", 1, 1);
  history.addDistribution("good", 1, {1, 2, 3, 4});
  history.sql(
      "INSERT INTO keys VALUES (10, CAST(x'61ff' AS TEXT)), (11, 'a' || char(27)), (12, x'62'), (13, 'days');"
      "INSERT INTO scalars SELECT id, 1, 7 FROM keys WHERE id BETWEEN 10 AND 12;"
      "INSERT INTO distribution_values SELECT id, 1, 0, 0, 7 FROM keys WHERE id BETWEEN 10 AND 12;"
      "INSERT INTO scalars VALUES (13, 1.5, 1), (13, 'day', 1), (13, x'00', 1), (13, 99999999999, 1), (13, "
      "2, 'v'),"
      " (13, 3, 1.5), (13, 4, 44);"
      "INSERT INTO distribution_values VALUES (13, -99999999999, 0, 0, 1), (13, 1.5, 0, 0, 1), (13, 'day', "
      "0, 0, 1),"
      " (13, 2, 'seq', 0, 1), (13, 3, 0, 0, 'v'), (13, 3, 1, 0, 33);"
      "UPDATE distribution_values SET seconds = 'noon' WHERE seq = 0 AND key_id = 1;"
      "UPDATE distribution_values SET seconds = 99999999999 WHERE seq = 2 AND key_id = 1;");
  const auto opened = history.services.analyticsHistory.open();
  EXPECT_EQ(testing::scalarLines(*opened), (Lines{"days 4 44", "good 1 1"}));
  EXPECT_EQ(testing::distributionLines(*opened), (Lines{"days 2:", "days 3: nan 33", "good 1: 2 4"}));
}

TEST(LinuxAnalyticsHistory, EndsAtADamagedPageOfALargeStore) {
  StoredAnalytics history;
  const std::vector<double> values(500000, 1.25);
  history.addDistribution("k", 1, values);
  history.addScalar("k", 1, 1);
  history.sql("PRAGMA wal_checkpoint(TRUNCATE)");
  const auto middle = static_cast<std::streamoff>(fs::file_size(history.store.file()) / 2 / 4096 * 4096);
  ASSERT_GT(middle, 4 << 20);
  std::fstream(history.store.file(), std::ios::in | std::ios::out | std::ios::binary).seekp(middle)
      << std::string(4096, '\xA5');

  const auto opened = history.services.analyticsHistory.open();
  EXPECT_EQ(testing::scalarLines(*opened), Lines{"k 1 1"});
  std::size_t delivered = 0;
  int rows = 0;
  const auto count = [&](std::string_view, DayNumber, DistributionEnumerator& enumerator, bool&) {
    double value = 0;
    std::int32_t seconds = 0;
    for (++rows; enumerator.nextValue(value, seconds);) ++delivered;
    EXPECT_FALSE(enumerator.nextValue(value, seconds));
  };
  opened->enumerateDistributions("", 0, 9, count);
  EXPECT_EQ(rows, 1);
  EXPECT_GT(delivered, 100000U);
  EXPECT_LT(delivered, values.size());
}

TEST(AnalyticsHome, IsTheContainerInMultiUserModeAndIsAskedForUntilItIsFound) {
  testing::FakeDeviceAnswers device;
  testing::FakeFileSystem files;
  const testing::TemporaryFolder root;
  const Host host(root.path(), false);
  const auto place = [&] { return analyticsStoreLocator(host, device, files)().value_or("none"); };
  const fs::path single = root.path() / "var/mobile/Library/Tallybook/TBDataStore.sqlitedb";
  EXPECT_EQ(place(), single);
  files.files["/var/db/forceMultiUserMode"] = {};
  EXPECT_EQ(place(), single);
  device.answers.set("InternalBuild", PlistValue::boolean(true));
  EXPECT_EQ(place(), "none");
  device.answers.set("InternalBuild", PlistValue());
  device.multiUser = true;
  const AnalyticsStoreLocator locate = analyticsStoreLocator(host, device, files);
  EXPECT_EQ(locate(), std::nullopt);
  EXPECT_EQ(testing::scalarLines(*LinuxAnalyticsHistory(locate).open()), Lines{});
  device.containers["systemgroup.com.velmora.sysmetrics"] = "/group";
  EXPECT_EQ(locate(), root.path() / "group/Library/Tallybook/TBDataStore.sqlitedb");

  const Host absent(root.path() / "absent", false);
  EXPECT_EQ(analyticsStoreLocator(absent, device, files)(), std::nullopt);
  EXPECT_FALSE(fs::exists(absent.root()));
}

}  // namespace
}  // namespace tbdaily

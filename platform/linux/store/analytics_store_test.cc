// The analytics store: its rows, what becomes of damaged and foreign ones, writers beside each other.
#include "platform/linux/store/analytics_store.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fstream>
#include <random>
#include <thread>

#include "platform/linux/host_test_support.h"
#include "platform/linux/store/sqlite_analytics_history.h"
#include "testing/analytics_contract.h"
#include "testing/fake_services.h"

namespace tbdaily {
namespace {

namespace fs = std::filesystem;
using namespace std::chrono_literals;
using testing::Lines;

struct StoredAnalytics : testing::TestPlatform {
  const std::string folder = "/var/mobile/Library/Tallybook";
  const fs::path file = host.files().place(folder) / "TBDataStore.sqlitedb";
  StorePlace place() {
    StorePlace p = storePlaceOf(host.files(), folder + "/TBDataStore.sqlitedb");
    p.condition = std::make_shared<StoreCondition>(50ms);
    return p;
  }
  AnalyticsStore store{place()};

  void setToday(PlistDate now) { setClock(now.unixSeconds()); }
  void addScalar(std::string_view key, DayNumber day, std::int64_t value) {
    EXPECT_TRUE(store.setScalar(key, day, value).ok());
  }
  void addDistribution(std::string_view key, DayNumber day, const std::vector<double>& values) {
    EXPECT_TRUE(store.appendDistributionValues(key, day, 0, values).ok());
  }
};

class AnalyticsStoreTest : public ::testing::Test, protected StoredAnalytics {
 protected:
  std::unique_ptr<OpenAnalyticsHistory> history() { return services.analyticsHistory.open(); }
  Lines scalars() { return testing::scalarLines(*history()); }
  Lines distributions() { return testing::distributionLines(*history()); }

  int openFile(SqliteDatabase& database) {
    return database.open(std::make_shared<DeviceFolder>(openFolder(folder)), file.filename(),
                         SqliteMode::ReadWrite, 50ms);
  }
  // What another program does to the file.
  void sql(const std::string& statements) {
    if (!fs::exists(file)) putAt(file, "");
    SqliteDatabase database;
    ASSERT_EQ(openFile(database), 0);
    ASSERT_EQ(database.execute(statements.c_str()), 0) << database.errorMessage();
  }
  // Names and bytes of the store's folder.
  std::map<std::string, std::string> folderContents() {
    std::map<std::string, std::string> contents;
    for (const std::string& name : names(folder)) {
      if (fs::is_regular_file(file.parent_path() / name)) contents[name] = text(folder + "/" + name);
    }
    return contents;
  }
};

unsigned modeOf(const fs::path& path) {
  struct stat status {};
  return ::stat(path.c_str(), &status) == 0 ? status.st_mode & 07777U : 0;
}

TEST_F(AnalyticsStoreTest, IsMadeAtTheFirstWriteForItsOwnerAlone) {
  PrunedRows pruned;
  EXPECT_TRUE(store.checkpoint().ok());
  EXPECT_TRUE(store.prune(5, Pruning::Remove, pruned).ok());
  EXPECT_EQ(scalars(), Lines{});
  EXPECT_FALSE(fs::exists(file.parent_path()));

  const mode_t previous = ::umask(0277);
  ::umask(0);
  EXPECT_TRUE(store.setScalar("k", 1, 2).ok());
  ::umask(previous);
  EXPECT_EQ(modeOf(file.parent_path()), 0700U);
  for (const char* suffix : {"", "-wal", "-shm"}) EXPECT_EQ(modeOf(file.native() + suffix), 0600U) << suffix;
  EXPECT_EQ(scalars(), Lines{"k 1 2"});
}

TEST_F(AnalyticsStoreTest, LeavesAStoreThatItCannotUseAsItIs) {
  const auto withTables = [&](const std::string& more) {
    EXPECT_TRUE(AnalyticsStore(place()).setScalar("k", 1, 1).ok());
    sql(more);
  };
  const std::map<std::string, std::function<void()>> cases{
      {"no database", [&] { putAt(file, "something else altogether"); }},
      {"another version", [&] { withTables("PRAGMA user_version = 2"); }},
      {"another version in the log",
       [&] {
         withTables("PRAGMA journal_mode = WAL");
         SqliteDatabase other;
         ASSERT_EQ(openFile(other), 0);
         other.keepLogOnClose();
         ASSERT_EQ(other.execute("PRAGMA user_version = 3"), 0);
         other.close();
         fs::remove(file.native() + "-shm");
       }},
      {"no version", [&] { withTables("PRAGMA user_version = 0"); }},
      {"other tables", [&] { sql("CREATE TABLE keys (id, name); PRAGMA user_version = 1"); }},
      {"a damaged page",
       [&] {
         withTables("PRAGMA wal_checkpoint(TRUNCATE)");
         std::fstream stream(file, std::ios::in | std::ios::out | std::ios::binary);
         stream.seekp(4 * 4096) << std::string(4096, '\xA5');
       }},
      {"a folder", [&] { fs::create_directories(file / "store"); }},
  };
  for (const auto& [name, make] : cases) {
    SCOPED_TRACE(name);
    fs::remove_all(file.parent_path());
    make();
    if (!fs::is_directory(file)) fs::permissions(file, fs::perms(0644));
    const unsigned mode = modeOf(file);
    const auto before = folderContents();
    PrunedRows pruned;
    EXPECT_EQ(store.setScalar("k", 1, 2).fault, StoreFault::Unusable);
    EXPECT_EQ(store.prune(9, Pruning::Remove, pruned).fault, StoreFault::Unusable);
    EXPECT_EQ(store.checkpoint().fault, StoreFault::Unusable);
    EXPECT_EQ(scalars(), Lines{});
    EXPECT_EQ(folderContents(), before);
    EXPECT_EQ(modeOf(file), mode);
  }
}

TEST_F(AnalyticsStoreTest, WritesToTheFileThatIsThereNowAndTakesAnEmptyOneForANewStore) {
  addScalar("old", 1, 1);
  for (const char* contents : {"", "PRAGMA journal_mode = WAL"}) {
    fs::remove_all(file.parent_path());
    sql(contents);
    EXPECT_EQ(scalars(), Lines{});
    addScalar("k", 1, 2);
    EXPECT_EQ(scalars(), Lines{"k 1 2"});
  }
}

TEST_F(AnalyticsStoreTest, LosesNoAdditionOfSeveralWritersAtOnce) {
  constexpr int kAdditions = 200;
  const auto add = [this] {
    AnalyticsStore own(storePlaceOf(host.files(), folder + "/TBDataStore.sqlitedb"));
    bool isGood = true;
    for (int i = 0; i < kAdditions; ++i)
      isGood &= own.addScalar("k", 1, 1).ok() && own.appendDistributionValues("d", 1, 0, {{1.0}}).ok();
    return isGood;
  };
  const pid_t child = ::fork();
  if (child == 0) ::_exit(add() ? 0 : 1);
  std::thread thread([&] { EXPECT_TRUE(add()); });
  EXPECT_TRUE(add());
  thread.join();
  int status = -1;
  ::waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
  EXPECT_EQ(scalars(), Lines{"k 1 600"});
  EXPECT_EQ(distributions().at(0).size(), std::string("d 1:").size() + 600 * 2);
}

TEST_F(AnalyticsStoreTest, GivesUpOnALockedStoreAndGoesOnWhenItIsFree) {
  EXPECT_TRUE(store.setScalar("k", 1, 1).ok());
  {
    SqliteDatabase other;
    ASSERT_EQ(openFile(other), 0);
    ASSERT_EQ(other.execute("BEGIN IMMEDIATE"), 0);
    EXPECT_EQ(store.addScalar("k", 1, 1).fault, StoreFault::Locked);
    EXPECT_EQ(scalars(), Lines{"k 1 1"});
  }
  EXPECT_TRUE(store.addScalar("k", 1, 1).ok());
  EXPECT_EQ(scalars(), Lines{"k 1 2"});
}

TEST_F(AnalyticsStoreTest, RefusesKeysThatNoReportCanCarry) {
  const std::string longest(kLongestAnalyticsKey, 'k');
  for (const std::string& key : {longest + "k", std::string("\xFF"), std::string("\xED\xA0\x80"),
                                 std::string("a\0", 2), std::string("\x1B[m"), std::string("\xEF\xBF\xBF")}) {
    EXPECT_EQ(store.setScalar(key, 1, 1).fault, StoreFault::UnusableKey) << key;
  }
  EXPECT_FALSE(fs::exists(file));
  for (const std::string& key : {longest, std::string("\xF0\x9F\x98\x80\t")}) {
    EXPECT_TRUE(store.setScalar(key, 1, 1).ok()) << key;
  }
}

TEST_F(AnalyticsStoreTest, PrunesOlderRowsAndKeysWithoutRows) {
  const std::vector<double> values{1, 2};
  for (const DayNumber day : {-1, 4, 5}) {
    EXPECT_TRUE(store.setScalar("both", day, 1).ok());
    EXPECT_TRUE(store.appendDistributionValues("both", day, 0, values).ok());
  }
  EXPECT_TRUE(store.setScalar("gone", 4, 1).ok());
  PrunedRows pruned;
  EXPECT_TRUE(store.prune(5, Pruning::Remove, pruned).ok());
  EXPECT_EQ(pruned.scalars, 3);
  EXPECT_EQ(pruned.distributionValues, 4);
  EXPECT_EQ(pruned.keys, 1);
  EXPECT_EQ(scalars(), Lines{"both 5 1"});
  EXPECT_EQ(distributions(), Lines{"both 5: 1 2"});
}

TEST_F(AnalyticsStoreTest, TruncatesTheLogAtACheckpointUnlessSomebodyReadsIt) {
  addScalar("k", 1, 1);
  EXPECT_TRUE(store.checkpoint().ok());
  EXPECT_EQ(fs::file_size(file.native() + "-wal"), 0U);
  addScalar("l", 1, 1);
  const auto reader = history();
  addScalar("k", 1, 2);
  EXPECT_TRUE(store.checkpoint().ok());
  EXPECT_EQ(testing::scalarLines(*reader), (Lines{"k 1 1", "l 1 1"}));
  EXPECT_GT(fs::file_size(file.native() + "-wal"), 0U);
}

TEST_F(AnalyticsStoreTest, AppendsNothingBehindTheLargestSequenceNumber) {
  EXPECT_TRUE(store.appendDistributionValues("k", 1, 0, {{1.0}}).ok());
  sql("UPDATE distribution_values SET seq = 9223372036854775806");
  EXPECT_EQ(store.appendDistributionValues("k", 1, 0, {{2.0}}).fault, StoreFault::Failed);
  EXPECT_EQ(distributions(), Lines{"k 1: 1"});
}

TEST_F(AnalyticsStoreTest, PassesOverWhatAForeignProgramLeft) {
  addScalar("good", 1, 1);
  addDistribution("good", 1, {1, 2, 3, 4});
  sql("INSERT INTO keys VALUES (10, CAST(x'61ff' AS TEXT)), (11, 'a' || char(27)), (12, x'62'), (13, 'days');"
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
  const auto opened = history();
  EXPECT_EQ(testing::scalarLines(*opened), (Lines{"days 4 44", "good 1 1"}));
  EXPECT_EQ(testing::distributionLines(*opened), (Lines{"days 2:", "days 3: nan 33", "good 1: 2 4"}));
}

TEST_F(AnalyticsStoreTest, FindsTheRowsOfSomeDaysAmongThoseOfAnyOthers) {
  addScalar("k", 0, 0);
  addDistribution("k", 0, {0});
  std::mt19937 random(1);
  std::string rows;
  const auto oneOf = [&random](std::vector<std::string> choices) {
    return choices[random() % choices.size()];
  };
  for (int i = 0; i < 60; ++i) {
    const std::string id = oneOf({"2", "3", "4", "5", "-7", "9223372036854775807", "-9223372036854775808"});
    rows += "INSERT OR IGNORE INTO keys VALUES (" + id + ", 'name' || abs(" + id + " % 100));";
  }
  for (int i = 0; i < 600; ++i) {
    const std::string id = oneOf({"2", "3", "4", "5", "6", "-7", "9223372036854775807",
                                  "-9223372036854775808", "2.5", "-1e30", "1e30", "'k'", "x'00'"});
    const std::string day = random() % 4 != 0 ? std::to_string(static_cast<int>(random() % 40) - 20)
                                              : oneOf({"2.5", "-3e9", "3e9", "99999999999", "'d'", "x'00'"});
    rows += "INSERT OR IGNORE INTO scalars VALUES (" + id + ", " + day + ", " + std::to_string(i) + ");";
    rows += "INSERT OR IGNORE INTO distribution_values VALUES (" + id + ", " + day + ", " +
            std::to_string(i % 3) + ", 0, " + std::to_string(i) + ");";
  }
  sql("BEGIN;" + rows + "COMMIT");
  SqliteDatabase plain;
  ASSERT_EQ(openFile(plain), 0);
  for (int from = -22; from < 22; ++from) {
    for (const int to : {from - 1, from, from + 1, from + 9}) {
      Lines expected;
      SqliteStatement all = plain.prepare(
          "SELECT name || ' ' || day || ' ' || value FROM keys JOIN scalars ON id = key_id "
          "WHERE typeof(day) = 'integer' AND day BETWEEN ?1 AND ?2 ORDER BY name, day");
      all.bind(1, std::int64_t{from});
      all.bind(2, std::int64_t{to});
      while (all.step() == 100) expected.emplace_back(all.text(0));
      EXPECT_EQ(testing::scalarLines(*history(), "", from, to), expected) << from << " " << to;
      Lines rowNames;
      for (const std::string& line : testing::distributionLines(*history(), "", from, to))
        rowNames.push_back(line.substr(0, line.find(':')));
      for (std::string& line : expected) line.resize(line.rfind(' '));
      EXPECT_EQ(rowNames, expected) << from << " " << to;
    }
  }
}

TEST_F(AnalyticsStoreTest, EndsAtADamagedPageOfALargeStore) {
  const std::vector<double> values(500000, 1.25);
  addDistribution("k", 1, values);
  addScalar("k", 1, 1);
  sql("PRAGMA wal_checkpoint(TRUNCATE)");
  const auto middle = static_cast<std::streamoff>(fs::file_size(file) / 2 / 4096 * 4096);
  ASSERT_GT(middle, 4 << 20);
  std::fstream(file, std::ios::in | std::ios::out | std::ios::binary).seekp(middle)
      << std::string(4096, '\xA5');

  const auto before = folderContents();
  EXPECT_EQ(scalars(), Lines{"k 1 1"});
  const auto damaged = history();
  const Lines rows = testing::distributionLines(*damaged);
  EXPECT_FALSE(damaged->isWhole());
  ASSERT_EQ(rows.size(), 1U);
  const std::size_t delivered = (rows[0].size() - std::string("k 1:").size()) / 2;
  EXPECT_TRUE(delivered > 100000 && delivered < values.size()) << delivered;
  services.analyticsClient.setValueForScalarKey("k", 2);  // nothing more is written
  services.analyticsClient.checkpoint();
  EXPECT_EQ(before.at("TBDataStore.sqlitedb"), folderContents().at("TBDataStore.sqlitedb"));
}

TEST(AnalyticsStoreLocator, FollowsTheAnalyticsHomeAndMakesNoRoot) {
  testing::FakeDeviceAnswers device;
  testing::FakeFileSystem files;
  AnalyticsHome home(device, files);
  device.multiUser = true;
  const testing::TemporaryFolder root;
  const Host host(root.path(), false), absent(root.path() / "absent", false);
  const AnalyticsStoreLocator locate = analyticsStoreLocator(host, home);
  EXPECT_FALSE(locate());
  EXPECT_EQ(testing::scalarLines(*SqliteAnalyticsHistory(locate).open()), Lines{});
  device.containers["systemgroup.com.velmora.sysmetrics"] = "/group";
  EXPECT_EQ(locate().value().file(), root.path() / "group/Library/Tallybook/TBDataStore.sqlitedb");
  EXPECT_FALSE(analyticsStoreLocator(absent, home)());
  EXPECT_FALSE(fs::exists(absent.root()));
}

}  // namespace

namespace testing {
INSTANTIATE_TYPED_TEST_SUITE_P(Stored, AnalyticsContract, StoredAnalytics);
INSTANTIATE_TYPED_TEST_SUITE_P(Stored, AnalyticsClientContract, StoredAnalytics);
}  // namespace testing
}  // namespace tbdaily

#include "platform/linux/analytics_store.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fstream>
#include <iterator>
#include <limits>
#include <map>
#include <thread>

#include "platform/linux/analytics_history.h"
#include "testing/analytics_lines.h"
#include "testing/temporary_folder.h"

namespace tbdaily {
namespace {

namespace fs = std::filesystem;
using namespace std::chrono_literals;
using testing::Lines;

class AnalyticsStoreTest : public ::testing::Test {
 protected:
  std::unique_ptr<OpenAnalyticsHistory> history() {
    return LinuxAnalyticsHistory([this] { return std::optional(file); }, 50ms).open();
  }

  // What another program does to the file.
  void sql(const char* statements) {
    if (!fs::exists(file)) put("");
    SqliteDatabase database;
    ASSERT_EQ(database.open(file, SqliteMode::ReadWrite, 50ms), 0);
    ASSERT_EQ(database.execute(statements), 0) << database.errorMessage();
  }
  void put(const std::string& contents) {
    fs::create_directories(file.parent_path());
    std::ofstream(file, std::ios::binary) << contents;
  }
  // Names and bytes of the store's folder.
  std::map<std::string, std::string> folderContents() {
    std::map<std::string, std::string> contents;
    for (const auto& entry : fs::directory_iterator(file.parent_path())) {
      if (!entry.is_regular_file()) continue;
      std::ifstream stream(entry.path(), std::ios::binary);
      contents[entry.path().filename()] = {std::istreambuf_iterator<char>(stream), {}};
    }
    return contents;
  }

  testing::TemporaryFolder folder;
  const fs::path file = folder.path() / "Library #1?" / "Tally%book" / "store";
  AnalyticsStore store{file, 50ms};
};

unsigned modeOf(const fs::path& path) {
  struct stat status {};
  return ::stat(path.c_str(), &status) == 0 ? status.st_mode & 07777U : 0;
}

TEST_F(AnalyticsStoreTest, IsMadeAtTheFirstWriteForItsOwnerAlone) {
  PrunedRows pruned;
  EXPECT_TRUE(store.checkpoint().ok());
  EXPECT_TRUE(store.prune(5, pruned).ok());
  EXPECT_EQ(testing::scalarLines(*history()), Lines{});
  EXPECT_FALSE(fs::exists(folder.path() / "Library #1?"));

  const mode_t previous = ::umask(0277);
  ::umask(0);
  EXPECT_TRUE(store.setScalar("k", 1, 2).ok());
  ::umask(previous);
  EXPECT_EQ(modeOf(file.parent_path()), 0700U);
  for (const char* suffix : {"", "-wal", "-shm"}) EXPECT_EQ(modeOf(file.native() + suffix), 0600U) << suffix;
  EXPECT_EQ(testing::scalarLines(*history()), Lines{"k 1 2"});
}

TEST_F(AnalyticsStoreTest, LeavesAStoreThatItCannotUseAsItIs) {
  const char* const tables =
      "CREATE TABLE keys (id INTEGER PRIMARY KEY, name TEXT NOT NULL UNIQUE);"
      "CREATE TABLE scalars (key_id INTEGER NOT NULL, day INTEGER NOT NULL, value INTEGER NOT NULL,"
      " PRIMARY KEY (key_id, day)) WITHOUT ROWID;"
      "CREATE TABLE distribution_values (key_id INTEGER NOT NULL, day INTEGER NOT NULL, seq INTEGER NOT NULL,"
      " seconds INTEGER NOT NULL, value REAL, PRIMARY KEY (key_id, day, seq)) WITHOUT ROWID;"
      "INSERT INTO keys VALUES (1, 'k'); INSERT INTO scalars VALUES (1, 1, 1);";
  const auto withTables = [&](const std::string& more) { sql((tables + more).c_str()); };
  const std::map<std::string, std::function<void()>> cases{
      {"no database", [&] { put("something else altogether"); }},
      {"a page of noise", [&] { put(std::string(8192, '\x5A')); }},
      {"another version", [&] { withTables("PRAGMA user_version = 2"); }},
      {"another version in the log",
       [&] {
         withTables("PRAGMA user_version = 1; PRAGMA journal_mode = WAL");
         SqliteDatabase other;
         ASSERT_EQ(other.open(file, SqliteMode::ReadWrite, 50ms), 0);
         other.keepLogOnClose();
         ASSERT_EQ(other.execute("PRAGMA user_version = 3"), 0);
         other.close();
         fs::remove(file.native() + "-shm");
       }},
      {"no version", [&] { withTables(""); }},
      {"other tables", [&] { sql("CREATE TABLE keys (id, name); PRAGMA user_version = 1"); }},
      {"a damaged page",
       [&] {
         withTables("PRAGMA user_version = 1; PRAGMA journal_mode = WAL");
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
    EXPECT_EQ(store.prune(9, pruned).fault, StoreFault::Unusable);
    EXPECT_EQ(store.checkpoint().fault, StoreFault::Unusable);
    EXPECT_EQ(testing::scalarLines(*history()), Lines{});
    EXPECT_EQ(folderContents(), before);
    EXPECT_EQ(modeOf(file), mode);
  }
}

TEST_F(AnalyticsStoreTest, TakesAnEmptyFileOrDatabaseForANewStore) {
  for (const char* contents : {"", "PRAGMA journal_mode = WAL"}) {
    fs::remove_all(file.parent_path());
    sql(contents);
    EXPECT_EQ(testing::scalarLines(*history()), Lines{});
    EXPECT_TRUE(store.setScalar("k", 1, 2).ok());
    EXPECT_EQ(testing::scalarLines(*history()), Lines{"k 1 2"});
  }
}

TEST_F(AnalyticsStoreTest, WritesToTheFileThatIsThereNow) {
  EXPECT_TRUE(store.setScalar("old", 1, 1).ok());
  fs::remove_all(file.parent_path());
  EXPECT_TRUE(store.setScalar("new", 1, 1).ok());
  EXPECT_EQ(testing::scalarLines(*history()), Lines{"new 1 1"});
}

TEST_F(AnalyticsStoreTest, LosesNoAdditionOfSeveralWritersAtOnce) {
  constexpr int kAdditions = 200;
  const auto add = [this] {
    AnalyticsStore own(file);
    for (int i = 0; i < kAdditions; ++i) {
      if (!own.addScalar("k", 1, 1).ok() || !own.appendDistributionValues("d", 1, 0, {{1.0}}).ok())
        return false;
    }
    return true;
  };
  const pid_t child = ::fork();
  if (child == 0) ::_exit(add() ? 0 : 1);
  bool inThread = false;
  std::thread thread([&] { inThread = add(); });
  EXPECT_TRUE(add());
  thread.join();
  int status = -1;
  ::waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
  EXPECT_TRUE(inThread);
  EXPECT_EQ(testing::scalarLines(*history()), Lines{"k 1 600"});
  EXPECT_EQ(testing::distributionLines(*history()).at(0).size(), std::string("d 1:").size() + 600 * 2);
}

TEST_F(AnalyticsStoreTest, GivesUpOnALockedStoreAndGoesOnWhenItIsFree) {
  EXPECT_TRUE(store.setScalar("k", 1, 1).ok());
  {
    SqliteDatabase other;
    ASSERT_EQ(other.open(file, SqliteMode::ReadWrite, 50ms), 0);
    ASSERT_EQ(other.execute("BEGIN IMMEDIATE"), 0);
    EXPECT_EQ(store.addScalar("k", 1, 1).fault, StoreFault::Locked);
    EXPECT_EQ(testing::scalarLines(*history()), Lines{"k 1 1"});
  }
  EXPECT_TRUE(store.addScalar("k", 1, 1).ok());
  EXPECT_EQ(testing::scalarLines(*history()), Lines{"k 1 2"});
}

TEST_F(AnalyticsStoreTest, KeepsWhatWasCommittedWhenAWriterIsKilled) {
  const pid_t child = ::fork();
  if (child == 0) {
    AnalyticsStore own(file);
    const std::vector<double> values(100000, 1.5);  // more than the page cache holds
    if (own.setScalar("k", 1, 1).ok() && own.beginLoad().ok() && own.setScalar("k", 1, 2).ok() &&
        own.appendDistributionValues("d", 1, 0, values).ok()) {
      ::raise(SIGKILL);
    }
    ::_exit(1);
  }
  int status = 0;
  ::waitpid(child, &status, 0);
  ASSERT_TRUE(WIFSIGNALED(status));
  EXPECT_EQ(testing::scalarLines(*history()), Lines{"k 1 1"});
  EXPECT_EQ(testing::distributionLines(*history()), Lines{});
  EXPECT_TRUE(store.addScalar("k", 1, 1).ok());
  EXPECT_EQ(testing::scalarLines(*history()), Lines{"k 1 2"});
}

TEST_F(AnalyticsStoreTest, RefusesKeysThatNoReportCanCarry) {
  const std::string longest(kLongestAnalyticsKey, 'k');
  for (const std::string& key : {longest + "k", std::string("\xFF"), std::string("\xED\xA0\x80"),
                                 std::string("a\0", 2), std::string("\x1B[m"), std::string("\xEF\xBF\xBF")}) {
    EXPECT_EQ(store.setScalar(key, 1, 1).fault, StoreFault::Failed) << key;
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
  EXPECT_TRUE(store.prune(5, pruned).ok());
  EXPECT_EQ(pruned.scalars, 3);
  EXPECT_EQ(pruned.distributionValues, 4);
  EXPECT_EQ(pruned.keys, 1);
  EXPECT_EQ(testing::scalarLines(*history()), Lines{"both 5 1"});
  EXPECT_EQ(testing::distributionLines(*history()), Lines{"both 5: 1 2"});
}

TEST_F(AnalyticsStoreTest, TruncatesTheLogAtACheckpointUnlessSomebodyReadsIt) {
  EXPECT_TRUE(store.setScalar("k", 1, 1).ok());
  const auto reader = history();
  EXPECT_TRUE(store.setScalar("k", 1, 2).ok());
  EXPECT_TRUE(store.checkpoint().ok());
  EXPECT_EQ(testing::scalarLines(*reader), Lines{"k 1 1"});
  EXPECT_GT(fs::file_size(file.native() + "-wal"), 0U);
}

TEST_F(AnalyticsStoreTest, LeavesAnEmptyLogAfterACheckpoint) {
  EXPECT_TRUE(store.setScalar("k", 1, 1).ok());
  EXPECT_TRUE(store.checkpoint().ok());
  EXPECT_EQ(fs::file_size(file.native() + "-wal"), 0U);
}

TEST_F(AnalyticsStoreTest, AppendsNothingBehindTheLargestSequenceNumber) {
  EXPECT_TRUE(store.appendDistributionValues("k", 1, 0, {{1.0}}).ok());
  sql("UPDATE distribution_values SET seq = 9223372036854775806");
  EXPECT_EQ(store.appendDistributionValues("k", 1, 0, {{2.0}}).fault, StoreFault::Failed);
  EXPECT_EQ(testing::distributionLines(*history()), Lines{"k 1: 1"});
}

}  // namespace
}  // namespace tbdaily

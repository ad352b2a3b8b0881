#include "platform/linux/store/store_file.h"

#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <thread>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host_notes.h"
#include "platform/utf8.h"

namespace tbdaily {

namespace fs = std::filesystem;

namespace {

constexpr std::int64_t kStoreVersion = 1;
// Up to this size a store is examined page by page before use: some 25 ms. In a larger one damage shows when
// it is met.
constexpr std::int64_t kFullExaminationBytes = 8'388'608;

constexpr const char* kCreateStore = R"(
CREATE TABLE keys (id INTEGER PRIMARY KEY, name TEXT NOT NULL UNIQUE);
CREATE TABLE scalars (key_id INTEGER NOT NULL REFERENCES keys(id), day INTEGER NOT NULL, value INTEGER NOT NULL,
                      PRIMARY KEY (key_id, day)) WITHOUT ROWID;
CREATE TABLE distribution_values (key_id INTEGER NOT NULL REFERENCES keys(id), day INTEGER NOT NULL, seq INTEGER NOT NULL,
                      seconds INTEGER NOT NULL, value REAL, PRIMARY KEY (key_id, day, seq)) WITHOUT ROWID;
PRAGMA user_version = 1;)";

constexpr std::string_view kDescribeColumns =
    R"(SELECT printf('%s %s %d: %s %s %d %d %d', t.name, t.type, t.wr, c.name, upper(c.type), c."notnull", c.pk, c.hidden)
FROM pragma_table_list AS t JOIN pragma_table_xinfo(t.name) AS c
WHERE t.schema = 'main' AND t.name IN ('keys', 'scalars', 'distribution_values') ORDER BY t.name, c.cid)";

// Table, its type, whether it is WITHOUT ROWID: column, type, NOT NULL, place in the primary key, hidden.
constexpr std::array<std::string_view, 10> kColumns{
    "distribution_values table 1: key_id INTEGER 1 1 0",
    "distribution_values table 1: day INTEGER 1 2 0",
    "distribution_values table 1: seq INTEGER 1 3 0",
    "distribution_values table 1: seconds INTEGER 1 0 0",
    "distribution_values table 1: value REAL 0 0 0",
    "keys table 0: id INTEGER 0 1 0",
    "keys table 0: name TEXT 1 0 0",
    "scalars table 1: key_id INTEGER 1 1 0",
    "scalars table 1: day INTEGER 1 2 0",
    "scalars table 1: value INTEGER 1 0 0",
};

fs::path beside(const fs::path& file, const char* suffix) {
  fs::path path = file;
  path += suffix;
  return path;
}

bool hasContents(const fs::path& path) {
  const std::optional<FileIdentity> identity = fileIdentity(path);
  return identity && identity->size > 0;
}

enum class StoreState { Missing, New, Usable, Unusable };

struct Verdict {
  StoreState state = StoreState::Missing;
  StoreResult result;
};

Verdict unusable(const fs::path& file, std::string_view reason) {
  return {StoreState::Unusable, unusableStore(file, reason)};
}

Verdict failed(const SqliteDatabase& database, const fs::path& file) {
  return {StoreState::Unusable, storeFailure(database, file)};
}

bool hasOurColumns(SqliteDatabase& database) {
  SqliteStatement columns = database.prepare(kDescribeColumns);
  for (const std::string_view expected : kColumns) {
    if (columns.step() != SQLITE_ROW || columns.text(0) != expected) return false;
  }
  return columns.step() == SQLITE_DONE;
}

// Only what concerns the tree of pages counts as damage; rows that break a constraint are passed over by who
// reads them.
bool hasDamagedPages(SqliteDatabase& database, std::string& report) {
  if (database.queryText("PRAGMA quick_check(1)", report) != SQLITE_OK) report = database.errorMessage();
  return report.starts_with("***") || database.errorCode() == SQLITE_CORRUPT;
}

enum class Examination { Layout, Pages };

Verdict examineState(SqliteDatabase& database, const fs::path& file, Examination examination) {
  std::int64_t version = 0;
  std::int64_t pages = 0;
  std::int64_t pageSize = 0;
  std::int64_t schemaEntries = 0;
  std::string encoding;
  if (database.queryInteger("PRAGMA user_version", version) != SQLITE_OK ||
      database.queryInteger("PRAGMA page_count", pages) != SQLITE_OK ||
      database.queryInteger("PRAGMA page_size", pageSize) != SQLITE_OK ||
      database.queryInteger("SELECT count(*) FROM sqlite_schema", schemaEntries) != SQLITE_OK ||
      database.queryText("PRAGMA encoding", encoding) != SQLITE_OK) {
    return failed(database, file);
  }
  if (version == 0 && schemaEntries == 0) return {StoreState::New, {}};
  if (version != kStoreVersion) {
    return unusable(
        file, "its user_version is " + std::to_string(version) + ", not " + std::to_string(kStoreVersion));
  }
  if (encoding != "UTF-8" || !hasOurColumns(database)) {
    const int code = database.errorCode();
    if (code == SQLITE_BUSY || code == SQLITE_IOERR) return failed(database, file);
    return unusable(file, "its tables are not those of an analytics store");
  }
  std::string report;
  if (examination == Examination::Pages && pages * pageSize <= kFullExaminationBytes &&
      hasDamagedPages(database, report)) {
    return unusable(file, "it is damaged: " + report);
  }
  return {StoreState::Usable, {}};
}

// Everything is judged by one state of the store, whoever writes to it meanwhile.
Verdict examine(SqliteDatabase& database, const fs::path& file, Examination examination) {
  if (!database.isOutsideTransaction()) return examineState(database, file, examination);
  if (database.execute("BEGIN") != SQLITE_OK) return failed(database, file);
  Verdict verdict = examineState(database, file, examination);
  database.execute("ROLLBACK");
  return verdict;
}

Verdict examineUntouched(const fs::path& file, Examination examination) {
  SqliteDatabase database;
  // All pages are wanted: they are read at once, not one by one.
  FileContents contents;
  if (examination == Examination::Pages &&
      readRegularFile(file, contents, static_cast<std::size_t>(kFullExaminationBytes)) == 0) {
    if (database.openImage(std::move(contents.bytes)) != SQLITE_OK) return failed(database, file);
    return examine(database, file, examination);
  }
  if (database.open(file, SqliteMode::Immutable, {}) != SQLITE_OK) return failed(database, file);
  return examine(database, file, examination);
}

bool isWritable(const fs::path& file) {
  return ::access(file.c_str(), W_OK) == 0 && ::access(file.parent_path().c_str(), W_OK) == 0;
}

// With a log beside it, the file alone does not tell what the store holds.
Verdict examineWithLog(const fs::path& file, std::chrono::milliseconds busyTimeout) {
  SqliteDatabase database;
  const SqliteMode mode = isWritable(file) ? SqliteMode::ReadWrite : SqliteMode::ReadOnly;
  if (database.open(file, mode, busyTimeout) != SQLITE_OK) return failed(database, file);
  database.keepLogOnClose();
  // Nobody has the store open when the shared index is missing, and under an exclusive lock none is made.
  if (mode == SqliteMode::ReadWrite && !fileIdentity(beside(file, "-shm")) &&
      database.execute("PRAGMA locking_mode = EXCLUSIVE") != SQLITE_OK) {
    return failed(database, file);
  }
  return examine(database, file, Examination::Pages);
}

Verdict examineFile(const fs::path& file, std::chrono::milliseconds busyTimeout) {
  struct stat status {};
  if (::stat(file.c_str(), &status) != 0) {
    if (errno == ENOENT || errno == ENOTDIR) return {};
    const int error = errno;  // no fault of the store's own
    return {StoreState::Unusable,
            {StoreFault::Failed, file.native() + " cannot be examined: " + errorText(error), error}};
  }
  if (!S_ISREG(status.st_mode)) return unusable(file, "it is not a regular file");
  if (status.st_size == 0) return {StoreState::New, {}};

  const fs::path log = storeLogOf(file);
  if (hasContents(log)) return examineWithLog(file, busyTimeout);
  // An interrupted transaction leaves the pages in need of its journal, so that only page 1 with the layout
  // can be judged.
  const Examination examination =
      hasContents(beside(file, "-journal")) ? Examination::Layout : Examination::Pages;
  Verdict verdict = examineUntouched(file, examination);
  if (verdict.state != StoreState::Unusable) return verdict;
  // A program that wrote meanwhile makes a sound store look torn.
  const bool untouched = fileIdentity(file) == FileIdentity::of(status) && !hasContents(log);
  return untouched ? verdict : examineWithLog(file, busyTimeout);
}

// A link is followed once, here: SQLite keeps the log beside the file that a link leads to.
fs::path resolved(const fs::path& file) {
  std::error_code error;
  fs::path target = fs::canonical(file, error);
  if (!error) return target;
  target = fs::absolute(file, error);
  return error ? file : target;
}

StoreResult cannotCreate(const fs::path& file, int error) {
  return {StoreFault::Failed, file.native() + " cannot be made: " + errorText(error), error};
}

// An empty file of mode 0600, whatever the umask; the log and the shared index take over its mode. No
// descriptor is opened: closing one would end the locks that another connection of this process already holds
// on the file.
StoreResult createFile(const fs::path& file) {
  fs::path existing = file.parent_path();
  while (existing.has_relative_path() && !fileIdentity(existing)) existing = existing.parent_path();
  if (const int error = makeFolders(file.parent_path()); error != 0) return cannotCreate(file, error);

  if (::mknod(file.c_str(), S_IFREG | 0600, 0) != 0) {
    return errno == EEXIST ? StoreResult{} : cannotCreate(file, errno);
  }
  if (::chmod(file.c_str(), 0600) != 0) return cannotCreate(file, errno);
  for (fs::path folder = file.parent_path();; folder = folder.parent_path()) {
    if (const int error = syncFolder(folder); error != 0) return cannotCreate(file, error);
    if (folder == existing || !folder.has_relative_path()) return {};
  }
}

// In one transaction, so that of two programs at once one makes the tables and the other finds them.
int createTables(SqliteDatabase& database, const fs::path& file) {
  if (const int code = database.execute("BEGIN IMMEDIATE"); code != SQLITE_OK) return code;
  const bool isNew = examine(database, file, Examination::Layout).state == StoreState::New;
  const int code = isNew ? database.execute(kCreateStore) : SQLITE_OK;
  return code != SQLITE_OK ? code : database.execute("COMMIT");
}

// Of two programs that want this of a new store at once, SQLite turns one away without the wait that it
// grants elsewhere.
int switchToLog(SqliteDatabase& database, std::chrono::milliseconds busyTimeout) {
  const auto deadline = std::chrono::steady_clock::now() + busyTimeout;
  while (true) {
    const int code = database.execute("PRAGMA journal_mode = WAL; PRAGMA synchronous = NORMAL");
    if (code != SQLITE_BUSY || std::chrono::steady_clock::now() >= deadline) return code;
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
}

}  // namespace

fs::path storeLogOf(const fs::path& file) {
  return beside(file, "-wal");
}

std::optional<std::string_view> analyticsKeyFault(std::string_view key) {
  if (key.size() > kLongestAnalyticsKey) return "the key is longer than 1024 bytes";
  while (!key.empty()) {
    const std::size_t length = utf8CharacterLength(key);
    if (length == 0) return "the key is not UTF-8";
    if (carriedCharacterLength(key) == 0) return "the key holds a character that a report cannot carry";
    key.remove_prefix(length);
  }
  return std::nullopt;
}

StoreResult unusableStore(const fs::path& file, std::string_view reason) {
  std::string error = file.native();
  error.append(" cannot be used as the analytics store: ").append(reason);
  std::replace(error.begin(), error.end(), '\n', ' ');
  error.append("; it is left as it is, move it away and the next write makes a new one");
  return {StoreFault::Unusable, std::move(error), 0};
}

StoreResult storeFailure(const SqliteDatabase& database, const fs::path& file) {
  const int code = database.errorCode();
  if (code == SQLITE_CORRUPT || code == SQLITE_NOTADB) return unusableStore(file, database.errorMessage());
  if (code == SQLITE_BUSY || code == SQLITE_LOCKED) {
    return {StoreFault::Locked, file.native() + " is kept locked by another program", 0};
  }
  return {StoreFault::Failed, file.native() + ": " + database.errorMessage(), 0};
}

OpenedStore openStoreForReading(const fs::path& place, std::chrono::milliseconds busyTimeout) {
  const fs::path file = resolved(place);
  Verdict verdict = examineFile(file, busyTimeout);
  if (verdict.state != StoreState::Usable) return {{}, std::move(verdict.result)};

  SqliteMode mode = SqliteMode::ReadWrite;
  if (!isWritable(file)) mode = hasContents(storeLogOf(file)) ? SqliteMode::ReadOnly : SqliteMode::Immutable;
  SqliteDatabase database;
  if (database.open(file, mode, busyTimeout) != SQLITE_OK || database.execute("BEGIN") != SQLITE_OK) {
    return {{}, storeFailure(database, file)};
  }
  verdict = examine(database, file, Examination::Layout);
  if (verdict.state != StoreState::Usable) return {{}, std::move(verdict.result)};
  return {std::move(database), {}};
}

OpenedStore openStoreForWriting(const fs::path& place, MissingStore missing,
                                std::chrono::milliseconds busyTimeout) {
  const fs::path file = resolved(place);
  Verdict verdict = examineFile(file, busyTimeout);
  if (verdict.state == StoreState::Unusable) return {{}, std::move(verdict.result)};
  if (verdict.state == StoreState::Missing) {
    if (missing == MissingStore::Leave) return {};
    if (StoreResult made = createFile(file); !made.ok()) return {{}, std::move(made)};
  }

  SqliteDatabase database;
  if (database.open(file, SqliteMode::ReadWrite, busyTimeout) != SQLITE_OK) {
    return {{}, storeFailure(database, file)};
  }
  verdict = examine(database, file, Examination::Layout);
  if (verdict.state == StoreState::New) {
    if (missing == MissingStore::Leave) return {};
    if (createTables(database, file) != SQLITE_OK) return {{}, storeFailure(database, file)};
    verdict = examine(database, file, Examination::Layout);
  }
  if (verdict.state != StoreState::Usable) return {{}, std::move(verdict.result)};
  if (switchToLog(database, busyTimeout) != SQLITE_OK) return {{}, storeFailure(database, file)};
  return {std::move(database), {}};
}

}  // namespace tbdaily

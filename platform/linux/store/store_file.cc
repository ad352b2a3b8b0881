#include "platform/linux/store/store_file.h"

#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <thread>

#include "platform/linux/base/host_notes.h"
#include "platform/utf8.h"

namespace tbdaily {

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

constexpr const char* kLogSuffix = "-wal";
constexpr const char* kIndexSuffix = "-shm";
constexpr const char* kJournalSuffix = "-journal";

// A store whose folder is open.
struct Site {
  const StorePlace& place;
  std::shared_ptr<const DeviceFolder> folder;

  std::chrono::milliseconds patience() const { return place.condition->patience(); }
  std::string beside(const char* suffix) const { return place.name + suffix; }
  bool has(const char* suffix) const { return folder->has(beside(suffix)); }
  bool hasContents(const char* suffix) const {
    struct stat status {};
    return folder->status(beside(suffix), status) == 0 && status.st_size > 0;
  }
  bool isWritable() const {
    const int at = folder->descriptor();
    return ::faccessat(at, place.name.c_str(), W_OK, 0) == 0 && ::faccessat(at, ".", W_OK, 0) == 0;
  }
  int open(SqliteDatabase& database, SqliteMode mode) const {
    return database.open(folder, place.name, mode, patience());
  }
};

enum class StoreState { Missing, New, Usable, Unusable };

struct Verdict {
  StoreState state = StoreState::Missing;
  StoreResult result;
};

Verdict unusable(const StorePlace& place, std::string_view reason) {
  return {StoreState::Unusable, unusableStore(place, reason)};
}

Verdict failed(const SqliteDatabase& database, const StorePlace& place) {
  return {StoreState::Unusable, storeFailure(database, place)};
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

Verdict examineState(SqliteDatabase& database, const StorePlace& place, Examination examination) {
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
    return failed(database, place);
  }
  if (version == 0 && schemaEntries == 0) return {StoreState::New, {}};
  if (version != kStoreVersion) {
    return unusable(
        place, "its user_version is " + std::to_string(version) + ", not " + std::to_string(kStoreVersion));
  }
  if (encoding != "UTF-8" || !hasOurColumns(database)) {
    const int code = database.errorCode();
    if (code == SQLITE_BUSY || code == SQLITE_IOERR) return failed(database, place);
    return unusable(place, "its tables are not those of an analytics store");
  }
  std::string report;
  if (examination == Examination::Pages && pages * pageSize <= kFullExaminationBytes &&
      hasDamagedPages(database, report)) {
    return unusable(place, "it is damaged: " + report);
  }
  return {StoreState::Usable, {}};
}

// Everything is judged by one state of the store, whoever writes to it meanwhile.
Verdict examine(SqliteDatabase& database, const StorePlace& place, Examination examination) {
  if (!database.isOutsideTransaction()) return examineState(database, place, examination);
  if (database.execute("BEGIN") != SQLITE_OK) return failed(database, place);
  Verdict verdict = examineState(database, place, examination);
  database.execute("ROLLBACK");
  return verdict;
}

// The database is an image of the file, where that is small enough to be examined as one.
Verdict examineUntouched(const Site& site, Examination examination, SqliteDatabase& database) {
  // All pages are wanted: they are read at once, not one by one.
  FileDescriptor file;
  FileContents contents;
  if (examination == Examination::Pages && site.folder->openForReading(site.place.name, file) == 0 &&
      readOpenFile(file.get(), contents, static_cast<std::size_t>(kFullExaminationBytes)) == 0) {
    StoreCondition& condition = *site.place.condition;
    if (database.openImage(std::move(contents.bytes)) != SQLITE_OK) return failed(database, site.place);
    if (condition.isKnownWhole(contents.identity)) return examine(database, site.place, Examination::Layout);
    Verdict verdict = examine(database, site.place, examination);
    if (verdict.state == StoreState::Usable) condition.setWhole(contents.identity);
    return verdict;
  }
  if (site.open(database, SqliteMode::Immutable) != SQLITE_OK) return failed(database, site.place);
  return examine(database, site.place, examination);
}

// With a log beside it, the file alone does not tell what the store holds.
Verdict examineWithLog(const Site& site) {
  SqliteDatabase database;
  const SqliteMode mode = site.isWritable() ? SqliteMode::ReadWrite : SqliteMode::ReadOnly;
  if (site.open(database, mode) != SQLITE_OK) return failed(database, site.place);
  database.keepLogOnClose();
  // Nobody has the store open when the shared index is missing, and under an exclusive lock none is made.
  if (mode == SqliteMode::ReadWrite && !site.has(kIndexSuffix) &&
      database.execute("PRAGMA locking_mode = EXCLUSIVE") != SQLITE_OK) {
    return failed(database, site.place);
  }
  return examine(database, site.place, Examination::Pages);
}

Verdict cannotBeExamined(const StorePlace& place, int error) {  // no fault of the store's own
  return {StoreState::Unusable,
          {StoreFault::Failed, place.file().native() + " cannot be examined: " + errorText(error), error}};
}

// What lies at the store's place and beside it are regular files that have no other name.
int judgeFiles(const Site& site) {
  for (const char* suffix : {"", kLogSuffix, kIndexSuffix, kJournalSuffix}) {
    struct stat status {};
    const int error = site.folder->status(site.beside(suffix), status);
    if (error == ENOENT) continue;
    if (error != 0) return error;
    if (S_ISLNK(status.st_mode)) return kLinkInPlace;
    if (!S_ISREG(status.st_mode)) return kNotARegularFile;
    if (status.st_nlink > 1) return kSecondName;
  }
  return 0;
}

// `image` is a connection to the whole store in memory where that is what was examined; else it is closed.
Verdict examineFile(const Site& site, SqliteDatabase& image) {
  const StorePlace& place = site.place;
  if (place.condition->isDamaged()) return unusable(place, "it is damaged");
  struct stat status {};
  int error = site.folder->status(place.name, status);
  if (error == ENOENT) return {};
  if (error == 0) error = judgeFiles(site);
  if (error >= kForeignLink) return unusable(place, errorText(error));
  if (error != 0) return cannotBeExamined(place, error);
  if (status.st_size == 0) return {StoreState::New, {}};

  if (site.hasContents(kLogSuffix)) return examineWithLog(site);
  // An interrupted transaction leaves the pages in need of its journal, so that only page 1 with the layout
  // can be judged.
  const Examination examination = site.hasContents(kJournalSuffix) ? Examination::Layout : Examination::Pages;
  Verdict verdict = examineUntouched(site, examination, image);
  // A program that wrote meanwhile makes a sound store look torn, and the image old.
  struct stat now {};
  const bool untouched = site.folder->status(place.name, now) == 0 &&
                         FileIdentity::of(now) == FileIdentity::of(status) && !site.hasContents(kLogSuffix);
  if (!untouched || examination == Examination::Layout || !image.isImage()) image.close();
  return untouched || verdict.state != StoreState::Unusable ? verdict : examineWithLog(site);
}

StoreResult cannotCreate(const StorePlace& place, int error) {
  return {StoreFault::Failed, place.file().native() + " cannot be made: " + errorText(error), error};
}

// In one transaction, so that of two programs at once one makes the tables and the other finds them.
int createTables(SqliteDatabase& database, const StorePlace& place) {
  if (const int code = database.execute("BEGIN IMMEDIATE"); code != SQLITE_OK) return code;
  const bool isNew = examine(database, place, Examination::Layout).state == StoreState::New;
  const int code = isNew ? database.execute(kCreateStore) : SQLITE_OK;
  return code != SQLITE_OK ? code : database.execute("COMMIT");
}

// Of two programs that want this of a new store at once, SQLite turns one away without the wait that it
// grants elsewhere.
int switchToLog(SqliteDatabase& database, std::chrono::milliseconds patience) {
  const auto deadline = std::chrono::steady_clock::now() + patience;
  while (true) {
    const int code = database.execute("PRAGMA journal_mode = WAL; PRAGMA synchronous = FULL");
    if (code != SQLITE_BUSY || std::chrono::steady_clock::now() >= deadline) return code;
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
}

// The folder of the store, opened or made. A folder that is missing is no error where the store may be
// missing.
int openSite(Site& site, MissingStore missing) {
  auto folder = std::make_shared<DeviceFolder>();
  const DeviceFiles& files = *site.place.files;
  const int error = missing == MissingStore::Create ? files.makeFolder(site.place.folder, *folder)
                                                    : files.openFolder(site.place.folder, *folder);
  if (error == 0) site.folder = std::move(folder);
  return error;
}

}  // namespace

std::string storeLogOf(const std::string& name) {
  return name + kLogSuffix;
}

std::optional<std::string_view> analyticsKeyFault(std::string_view key) {
  if (key.size() > kLongestAnalyticsKey) return "the key is longer than 1024 bytes";
  if (isCarriedText(key)) return std::nullopt;
  return isUtf8(key) ? "the key holds a character that a report cannot carry" : "the key is not UTF-8";
}

StoreResult unusableStore(const StorePlace& place, std::string_view reason) {
  std::string error = place.file().native();
  error.append(" cannot be used as the analytics store: ").append(reason);
  std::replace(error.begin(), error.end(), '\n', ' ');
  error.append("; it is left as it is, move it away and the next write makes a new one");
  return {StoreFault::Unusable, std::move(error), 0};
}

StoreResult storeFailure(const SqliteDatabase& database, const StorePlace& place) {
  const int code = database.errorCode();
  if (code == SQLITE_CORRUPT || code == SQLITE_NOTADB) return unusableStore(place, database.errorMessage());
  if (code == SQLITE_BUSY || code == SQLITE_LOCKED) {
    place.condition->setLocked(true);
    return {StoreFault::Locked, place.file().native() + " is kept locked by another program", 0};
  }
  return {StoreFault::Failed, place.file().native() + ": " + database.errorMessage(), 0};
}

OpenedStore openStoreForReading(const StorePlace& place) {
  Site site{place, nullptr};
  if (const int error = openSite(site, MissingStore::Leave); error != 0) {
    if (error == ENOENT || error == kUnusableRoot) return {};
    return {{}, cannotBeExamined(place, error).result};
  }
  SqliteDatabase database;
  Verdict verdict = examineFile(site, database);
  if (verdict.state != StoreState::Usable) return {{}, std::move(verdict.result)};
  if (database.isOpen()) return {std::move(database), {}};

  SqliteMode mode = SqliteMode::ReadWrite;
  if (!site.isWritable()) mode = site.hasContents(kLogSuffix) ? SqliteMode::ReadOnly : SqliteMode::Immutable;
  if (site.open(database, mode) != SQLITE_OK || database.execute("BEGIN") != SQLITE_OK) {
    return {{}, storeFailure(database, place)};
  }
  verdict = examine(database, place, Examination::Layout);
  if (verdict.state != StoreState::Usable) return {{}, std::move(verdict.result)};
  return {std::move(database), {}};
}

OpenedStore openStoreCopy(FileDescriptor file, FileDescriptor log, const StorePlace& original) {
  SqliteDatabase database;
  bool complete = false;
  if (database.openUnnamed(std::move(file), std::move(log)) != SQLITE_OK ||
      database.truncateLog(complete) != SQLITE_OK) {
    return {{}, storeFailure(database, original)};
  }
  Verdict verdict = examine(database, original, Examination::Pages);
  if (verdict.state != StoreState::Usable) return {{}, std::move(verdict.result)};
  if (database.execute("BEGIN") != SQLITE_OK) return {{}, storeFailure(database, original)};
  return {std::move(database), {}};
}

OpenedStore openStoreForWriting(const StorePlace& place, MissingStore missing) {
  Site site{place, nullptr};
  if (const int error = openSite(site, missing); error != 0) {
    if (missing == MissingStore::Leave && (error == ENOENT || error == kUnusableRoot)) return {};
    return {{}, cannotCreate(place, error)};
  }
  SqliteDatabase image;
  Verdict verdict = examineFile(site, image);
  image.close();
  if (verdict.state == StoreState::Unusable) return {{}, std::move(verdict.result)};
  if (verdict.state == StoreState::Missing) {
    if (missing == MissingStore::Leave) return {};
    // Not opened: closing a descriptor would end the locks that another connection of this process already
    // holds on the file.
    const int error = site.folder->makeFileUnopened(place.name);
    if (error != 0 && error != EEXIST) return {{}, cannotCreate(place, error)};
    if (!place.files->makeDurable()) return {{}, cannotCreate(place, EIO)};
  }

  SqliteDatabase database;
  if (site.open(database, SqliteMode::ReadWrite) != SQLITE_OK) {
    return {{}, storeFailure(database, place)};
  }
  verdict = examine(database, place, Examination::Layout);
  if (verdict.state == StoreState::New) {
    if (missing == MissingStore::Leave) return {};
    if (createTables(database, place) != SQLITE_OK) return {{}, storeFailure(database, place)};
    verdict = examine(database, place, Examination::Layout);
  }
  if (verdict.state != StoreState::Usable) return {{}, std::move(verdict.result)};
  if (switchToLog(database, site.patience()) != SQLITE_OK) return {{}, storeFailure(database, place)};
  return {std::move(database), {}};
}

}  // namespace tbdaily

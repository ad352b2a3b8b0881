#include "platform/linux/store/analytics_store.h"

#include <sqlite3.h>
#include <unistd.h>

#include <cerrno>
#include <cmath>
#include <limits>
#include <utility>

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace {
// A load of more keys than this forgets those that it knew, so that its memory does not grow with its input.
constexpr std::size_t kLoadedKeysKept = 4096;
// A load in no order of its keys touches pages all over the store: in KiB, negative as SQLite counts it.
constexpr const char* kLoadCache = "PRAGMA cache_size = -32768";
constexpr const char* kUsualCache = "PRAGMA cache_size = -2000";
// What a foreign program can leave behind: the last value of a key and day carries the largest number that
// there is.
constexpr int kNoSequenceLeft = SQLITE_RANGE;
constexpr std::int64_t kEndOfSequence = std::numeric_limits<std::int64_t>::max();
}  // namespace

const std::array<std::string_view, AnalyticsStore::QueryCount> AnalyticsStore::kQueries{
    "SELECT id FROM keys WHERE name = ?1",
    "INSERT INTO keys (name) VALUES (?1) ON CONFLICT (name) DO NOTHING",
    "SELECT value FROM scalars WHERE key_id = ?1 AND day = ?2",
    "INSERT INTO scalars (key_id, day, value) VALUES (?1, ?2, ?3) "
    "ON CONFLICT (key_id, day) DO UPDATE SET value = excluded.value",
    "SELECT seq FROM distribution_values WHERE key_id = ?1 AND day = ?2 ORDER BY seq DESC LIMIT 1",
    "INSERT INTO distribution_values (key_id, day, seq, seconds, value) VALUES (?1, ?2, ?3, ?4, ?5)",
    "DELETE FROM scalars WHERE key_id IN (SELECT id FROM keys) AND day < ?1",
    "DELETE FROM distribution_values WHERE key_id IN (SELECT id FROM keys) AND day < ?1",
    "DELETE FROM keys WHERE NOT EXISTS (SELECT 1 FROM scalars WHERE key_id = keys.id) "
    "AND NOT EXISTS (SELECT 1 FROM distribution_values WHERE key_id = keys.id)",
};

StoreResult AnalyticsStore::setScalar(std::string_view key, DayNumber day, std::int64_t value) {
  return writeRow(key, [&](LoadedKey& entry) { return putScalar(entry, day, value); });
}

StoreResult AnalyticsStore::addScalar(std::string_view key, DayNumber day, std::int64_t increment) {
  return writeRow(key, [&](LoadedKey& entry) {
    auto sum = static_cast<std::uint64_t>(increment);
    if (entry.mayHaveScalars) {
      SqliteStatement& find = statement(FindScalar);
      const StatementRun run(find);
      find.bind(1, entry.id);
      find.bind(2, std::int64_t{day});
      const int code = find.step();
      if (code == SQLITE_ROW) sum += static_cast<std::uint64_t>(find.integer(0));
      if (code != SQLITE_ROW && code != SQLITE_DONE) return code;
    }
    return putScalar(entry, day, static_cast<std::int64_t>(sum));
  });
}

StoreResult AnalyticsStore::appendDistributionValues(std::string_view key, DayNumber day,
                                                     std::int32_t secondsInDay,
                                                     std::span<const double> values) {
  if (values.empty()) return {};
  return writeRow(key, [&](LoadedKey& entry) { return putValues(entry, day, secondsInDay, values); });
}

StoreResult AnalyticsStore::beginLoad() {
  const std::lock_guard lock(mutex_);
  if (StoreResult opened = open(MissingStore::Create); !opened.ok()) return opened;
  if (const int code = database_.execute("BEGIN IMMEDIATE"); code != SQLITE_OK) return failure(code);
  loading_ = true;
  database_.execute(kLoadCache);
  return {};
}

StoreResult AnalyticsStore::commitLoad() {
  const std::lock_guard lock(mutex_);
  StoreResult result = commit();
  endLoad();
  return result;
}

void AnalyticsStore::rollbackLoad() {
  const std::lock_guard lock(mutex_);
  if (!loading_) return;
  rollback();
  endLoad();
}

void AnalyticsStore::endLoad() {
  loading_ = false;
  forgetLoadedKeys();
  if (database_.isOpen()) database_.execute(kUsualCache);
}

StoreResult AnalyticsStore::prune(DayNumber beforeDay, Pruning pruning, PrunedRows& pruned) {
  const std::lock_guard lock(mutex_);
  pruned = {};
  if (StoreResult opened = open(MissingStore::Leave); !opened.ok() || !database_.isOpen()) return opened;
  PrunedRows removed;
  const std::array<std::pair<Query, std::int64_t*>, 3> steps{{{PruneScalars, &removed.scalars},
                                                              {PruneValues, &removed.distributionValues},
                                                              {PruneKeys, &removed.keys}}};
  const auto remove = [&] {
    for (const auto& [query, count] : steps) {
      SqliteStatement& deletion = statement(query);
      const StatementRun run(deletion);
      if (query != PruneKeys) deletion.bind(1, std::int64_t{beforeDay});
      if (const int code = deletion.step(); code != SQLITE_DONE) return code;
      *count = database_.changedRows();
    }
    return SQLITE_OK;
  };
  StoreResult result = transaction(remove, pruning == Pruning::Remove ? Ending::Commit : Ending::RollBack);
  if (result.ok()) pruned = removed;
  return result;
}

StoreResult AnalyticsStore::checkpoint() {
  const std::lock_guard lock(mutex_);
  if (StoreResult opened = open(MissingStore::Leave); !opened.ok() || !database_.isOpen()) return opened;
  bool complete = false;
  if (const int code = database_.truncateLog(complete); code != SQLITE_OK) return failure(code);
  if (complete) return succeeded();
  // Somebody reads: the log has to stay, and is forced to storage as it is.
  const std::string log = storeLogOf(place_.name);
  DeviceFolder folder;
  FileDescriptor file;
  int error = place_.files->openFolder(place_.folder, folder);
  if (error == 0) error = folder.openForReading(log, file);
  if (error == 0 && ::fsync(file.get()) != 0) error = errno;
  if (error == 0) return {};
  return {StoreFault::Failed, folder.place(log).native() + ": " + errorText(error), 0};
}

StoreResult AnalyticsStore::open(MissingStore missing) {
  // Within a load the connection stays what it is: a new one would have lost what was loaded.
  if (loading_) return {};
  rollback();  // of an operation that an exception ended
  if (place_.condition->isDamaged()) close();
  if (database_.isOpen() && !database_.hasMoved()) {
    database_.setBusyTimeout(place_.condition->patience());
    return {};
  }
  close();
  OpenedStore opened = openStoreForWriting(place_, missing);
  database_ = std::move(opened.database);
  return std::move(opened.result);
}

template <typename Write>
StoreResult AnalyticsStore::writeRow(std::string_view key, const Write& write) {
  if (const auto fault = analyticsKeyFault(key)) return {StoreFault::UnusableKey, std::string(*fault), 0};
  const std::lock_guard lock(mutex_);
  if (StoreResult opened = open(MissingStore::Create); !opened.ok()) return opened;
  if (!loading_) {
    return transaction([&] {
      LoadedKey entry;
      const int code = findOrInsertKey(key, entry);
      return code == SQLITE_OK ? write(entry) : code;
    });
  }
  // SQLite ends a transaction by itself when it runs out of room; what follows must not be written without
  // it.
  if (!database_.isOpen() || database_.isOutsideTransaction()) {
    return brokenOff();
  }
  LoadedKey* entry = nullptr;
  int code = loadedKey(key, entry);
  if (code == SQLITE_OK) code = write(*entry);
  return code == SQLITE_OK ? StoreResult{} : failure(code);
}

template <typename Body>
StoreResult AnalyticsStore::transaction(const Body& body, Ending ending) {
  if (const int code = database_.execute("BEGIN IMMEDIATE"); code != SQLITE_OK) return failure(code);
  if (const int code = body(); code != SQLITE_OK) {
    StoreResult result = failure(code);
    rollback();
    return result;
  }
  if (ending == Ending::Commit) return commit();
  rollback();
  return succeeded();
}

StoreResult AnalyticsStore::commit() {
  if (!database_.isOpen()) return brokenOff();
  const int code = database_.execute("COMMIT");
  if (code == SQLITE_OK) return succeeded();
  StoreResult result = failure(code);
  rollback();
  return result;
}

void AnalyticsStore::rollback() {
  if (database_.isOpen() && !database_.isOutsideTransaction()) database_.execute("ROLLBACK");
}

StoreResult AnalyticsStore::failure(int code) {
  if (code == kNoSequenceLeft) {
    return {StoreFault::Failed, file().native() + ": no value can be added to this key and day", 0};
  }
  StoreResult result = storeFailure(database_, place_);
  // Nothing more is written to a damaged store, its log included.
  if (result.fault == StoreFault::Unusable) {
    place_.condition->setDamaged();
    close();
  }
  return result;
}

StoreResult AnalyticsStore::succeeded() {
  place_.condition->setLocked(false);
  return {};
}

StoreResult AnalyticsStore::brokenOff() const {
  return {StoreFault::Failed, file().native() + ": the load was broken off", 0};
}

void AnalyticsStore::close() {
  statements_ = {};
  if (database_.isOpen() && place_.condition->isDamaged()) database_.keepLogOnClose();
  database_.close();
}

SqliteStatement& AnalyticsStore::statement(Query query) {
  SqliteStatement& prepared = statements_[query];
  if (!prepared) prepared = database_.prepare(kQueries[query]);
  return prepared;
}

int AnalyticsStore::findOrInsertKey(std::string_view key, LoadedKey& entry) {
  // Behind a new key comes another one as a rule, behind an old one an old one.
  const std::array<Query, 2> order =
      wasKeyNew_ ? std::array{InsertKey, FindKey} : std::array{FindKey, InsertKey};
  for (const Query query : order) {
    SqliteStatement& attempt = statement(query);
    const StatementRun run(attempt);
    attempt.bind(1, key);
    const int code = attempt.step();
    if (code != SQLITE_ROW && code != SQLITE_DONE) return code;
    const bool isNew = query == InsertKey && database_.changedRows() > 0;
    if (code == SQLITE_DONE && !isNew) continue;
    entry.id = isNew ? database_.lastInsertedRow() : attempt.integer(0);
    entry.mayHaveScalars = !isNew;
    wasKeyNew_ = isNew;
    return SQLITE_OK;
  }
  return SQLITE_ERROR;
}

int AnalyticsStore::loadedKey(std::string_view key, LoadedKey*& entry) {
  // Most lines have the key of the line before.
  if (lastLoaded_ == nullptr || lastLoaded_->first != key) {
    auto place = loadedKeys_.find(key);
    if (place == loadedKeys_.end()) {
      LoadedKey found;
      if (const int code = findOrInsertKey(key, found); code != SQLITE_OK) return code;
      if (loadedKeys_.size() == kLoadedKeysKept) forgetLoadedKeys();
      place = loadedKeys_.emplace(key, found).first;
    }
    lastLoaded_ = &*place;
  }
  entry = &lastLoaded_->second;
  return SQLITE_OK;
}

void AnalyticsStore::forgetLoadedKeys() {
  loadedKeys_.clear();
  lastLoaded_ = nullptr;
}

int AnalyticsStore::putScalar(LoadedKey& key, DayNumber day, std::int64_t value) {
  SqliteStatement& put = statement(SetScalar);
  const StatementRun run(put);
  put.bind(1, key.id);
  put.bind(2, std::int64_t{day});
  put.bind(3, value);
  key.mayHaveScalars = true;
  const int code = put.step();
  return code == SQLITE_DONE ? SQLITE_OK : code;
}

int AnalyticsStore::putValues(LoadedKey& key, DayNumber day, std::int32_t secondsInDay,
                              std::span<const double> values) {
  if (!key.hasSequence || key.day != day) {
    SqliteStatement& find = statement(FindLastSequence);
    const StatementRun run(find);
    find.bind(1, key.id);
    find.bind(2, std::int64_t{day});
    const int code = find.step();
    if (code != SQLITE_ROW && code != SQLITE_DONE) return code;
    key.nextSequence = 0;
    if (code == SQLITE_ROW) {
      const std::int64_t last = find.integer(0);
      if (!find.isInteger(0) || last == kEndOfSequence) return kNoSequenceLeft;
      key.nextSequence = last + 1;
    }
    key.day = day;
    key.hasSequence = true;
  }

  SqliteStatement& insert = statement(InsertValue);
  for (const double value : values) {
    if (key.nextSequence == kEndOfSequence) return kNoSequenceLeft;
    const StatementRun run(insert);
    insert.bind(1, key.id);
    insert.bind(2, std::int64_t{day});
    insert.bind(3, key.nextSequence);
    insert.bind(4, std::int64_t{secondsInDay});
    insert.bind(5, value);
    if (const int code = insert.step(); code != SQLITE_DONE) return code;
    ++key.nextSequence;
  }
  return SQLITE_OK;
}

}  // namespace tbdaily

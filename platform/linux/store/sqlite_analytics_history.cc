#include "platform/linux/store/sqlite_analytics_history.h"

#include <sqlite3.h>

#include <limits>
#include <optional>
#include <string>
#include <utility>

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace {

// Keys in the outer loop and days in the inner one: both indexes deliver in the order that is asked for,
// nothing is sorted.
constexpr std::string_view kScalars =
    "SELECT k.name, s.day, s.value FROM keys AS k CROSS JOIN scalars AS s "
    "WHERE k.name >= ?1 AND k.name < ?2 AND s.key_id = k.id AND s.day BETWEEN ?3 AND ?4 ORDER BY k.name, "
    "s.day";
constexpr std::string_view kKeys = "SELECT name, id FROM keys WHERE name >= ?1 AND name < ?2 ORDER BY name";
constexpr std::string_view kFirstDay =
    "SELECT day FROM distribution_values WHERE key_id = ?1 AND day >= ?2 AND day <= ?3 ORDER BY day LIMIT 1";
constexpr std::string_view kNextDay =
    "SELECT day FROM distribution_values WHERE key_id = ?1 AND day > ?2 AND day <= ?3 ORDER BY day LIMIT 1";
constexpr std::string_view kValues =
    "SELECT seq, seconds, value FROM distribution_values WHERE key_id = ?1 AND day = ?2 ORDER BY seq";

// The end of the range of the texts that begin with the prefix, in byte order.
void bindPrefix(SqliteStatement& statement, std::string_view prefix, std::string& end) {
  end = prefix;
  while (!end.empty() && static_cast<unsigned char>(end.back()) == 0xFF) end.pop_back();
  statement.bind(1, prefix);
  if (end.empty()) {
    statement.bindAboveEveryText(2);
    return;
  }
  end.back() = static_cast<char>(static_cast<unsigned char>(end.back()) + 1);
  statement.bind(2, std::string_view(end));
}

bool isInt32(std::int64_t value) {
  return value >= std::numeric_limits<std::int32_t>::min() &&
         value <= std::numeric_limits<std::int32_t>::max();
}

// What an enumeration needs of the history that it runs on.
class Reader {
 public:
  Reader(SqliteDatabase database, StorePlace place)
      : database_(std::move(database)), place_(std::move(place)) {}
  ~Reader() {
    if (hasFailed_ && database_.isOpen()) database_.keepLogOnClose();
  }
  Reader(const Reader&) = delete;
  Reader& operator=(const Reader&) = delete;

  SqliteDatabase& database() { return database_; }
  bool isOpen() const { return database_.isOpen(); }

  // Names what ended an enumeration early.
  void noteEnd(int code) {
    if (code == SQLITE_DONE) return;
    const StoreResult result = storeFailure(database_, place_);
    if (result.fault == StoreFault::Unusable) place_.condition->setDamaged();
    hasFailed_ = true;
    noteOnce(result.error);
  }
  // Rows that come in another order than that of their index are the work of a damaged index, which may go
  // round in circles.
  void noteDisorder() {
    place_.condition->setDamaged();
    hasFailed_ = true;
    noteOnce(unusableStore(place_, "its rows are out of order").error);
  }
  // Whether an enumeration ended early, so that what it delivered is a part.
  bool hasFailed() const { return hasFailed_; }
  void noteForeignRow() {
    noteOnce(place_.file().native() + ": rows with values of a foreign type or range are passed over");
  }
  bool isUsableKey(std::string_view key) {
    if (!analyticsKeyFault(key)) return true;
    noteOnce(place_.file().native() + ": rows with keys that no report can carry are passed over");
    return false;
  }

 private:
  SqliteDatabase database_;
  StorePlace place_;
  bool hasFailed_ = false;
};

// The values of one key and day. Asks the store for none of them before the first is wanted.
class StoredValues : public DistributionEnumerator {
 public:
  StoredValues(Reader& reader, SqliteStatement& statement, std::int64_t keyId, DayNumber day)
      : reader_(reader), statement_(statement), run_(statement), keyId_(keyId), day_(day) {}

  bool nextValue(double& value, std::int32_t& secondsInDay) override {
    if (ended_) return false;
    if (!started_) {
      statement_.bind(1, keyId_);
      statement_.bind(2, std::int64_t{day_});
    }
    while (true) {
      const int code = statement_.step();
      if (code != SQLITE_ROW) {
        reader_.noteEnd(code);
        return end(code != SQLITE_DONE);
      }
      const std::int64_t sequence = statement_.integer(0);
      if (started_ && sequence <= sequence_) {
        reader_.noteDisorder();
        return end(true);
      }
      started_ = true;
      sequence_ = sequence;
      if (statement_.isInteger(0) && statement_.isInteger(1) && isInt32(statement_.integer(1))) break;
      reader_.noteForeignRow();
      if (!statement_.isInteger(0)) return end(false);
    }
    secondsInDay = static_cast<std::int32_t>(statement_.integer(1));
    value = statement_.isNumber(2) ? statement_.real(2) : std::numeric_limits<double>::quiet_NaN();
    return true;
  }

  bool failed() const { return failed_; }

 private:
  bool end(bool failed) {
    ended_ = true;
    failed_ = failed;
    return false;
  }

  Reader& reader_;
  SqliteStatement& statement_;
  StatementRun run_;
  std::int64_t keyId_;
  DayNumber day_;
  std::int64_t sequence_ = 0;
  bool started_ = false;
  bool ended_ = false;
  bool failed_ = false;
};

// The days of one key that have values, ascending, each found by one seek.
class DayWalk {
 public:
  DayWalk(Reader& reader, DayNumber minimumDay, DayNumber maximumDay)
      : reader_(reader),
        first_(reader.database().prepare(kFirstDay)),
        next_(reader.database().prepare(kNextDay)),
        minimumDay_(minimumDay),
        maximumDay_(maximumDay) {}

  void start(std::int64_t keyId) {
    keyId_ = keyId;
    hasDay_ = false;
  }

  // SQLITE_ROW with a day, SQLITE_DONE, or what went wrong, already named.
  int advance(DayNumber& day) {
    while (true) {
      SqliteStatement& seek = hasDay_ ? next_ : first_;
      const StatementRun run(seek);
      seek.bind(1, keyId_);
      if (hasDay_) {
        seek.bind(2, lastDay_);
      } else {
        seek.bind(2, std::int64_t{minimumDay_});
      }
      seek.bind(3, std::int64_t{maximumDay_});
      const int code = seek.step();
      if (code != SQLITE_ROW) {
        reader_.noteEnd(code);
        return code;
      }
      const double found = seek.real(0);
      if (hasDay_ && !(found > lastDay_)) {
        reader_.noteDisorder();
        return SQLITE_CORRUPT;
      }
      hasDay_ = true;
      lastDay_ = found;
      const bool isDay = seek.isInteger(0) && isInt32(seek.integer(0));
      if (isDay) {
        day = static_cast<DayNumber>(seek.integer(0));
        return SQLITE_ROW;
      }
      reader_.noteForeignRow();
    }
  }

 private:
  Reader& reader_;
  SqliteStatement first_, next_;
  DayNumber minimumDay_, maximumDay_;
  std::int64_t keyId_ = 0;
  bool hasDay_ = false;
  double lastDay_ = 0;  // a foreign program may have left days with a fraction
};

class LinuxOpenHistory : public OpenAnalyticsHistory {
 public:
  LinuxOpenHistory(SqliteDatabase database, StorePlace place)
      : reader_(std::move(database), std::move(place)) {}

  void enumerateScalars(std::string_view keyPrefix, DayNumber minimumDay, DayNumber maximumDay,
                        const ScalarRowCallback& row) override;
  void enumerateDistributions(std::string_view keyPrefix, DayNumber minimumDay, DayNumber maximumDay,
                              const DistributionRowCallback& row) override;
  bool isWhole() const override { return !reader_.hasFailed(); }

 private:
  bool enumerateDays(std::string_view key, std::int64_t keyId, DayWalk& days, SqliteStatement& values,
                     const DistributionRowCallback& row);

  Reader reader_;
};

void LinuxOpenHistory::enumerateScalars(std::string_view keyPrefix, DayNumber minimumDay,
                                        DayNumber maximumDay, const ScalarRowCallback& row) {
  if (!reader_.isOpen()) return;
  SqliteStatement scalars = reader_.database().prepare(kScalars);
  std::string end;
  bindPrefix(scalars, keyPrefix, end);
  scalars.bind(3, std::int64_t{minimumDay});
  scalars.bind(4, std::int64_t{maximumDay});

  std::string key;
  bool hasKey = false;
  bool usable = false;
  double previousDay = 0;
  int code = SQLITE_DONE;
  for (bool stop = false; !stop && (code = scalars.step()) == SQLITE_ROW;) {
    const std::string_view name = scalars.text(0);
    const double day = scalars.real(1);
    const int order = hasKey ? name.compare(key) : 1;
    if (order < 0 || (order == 0 && !(day > previousDay))) return reader_.noteDisorder();
    if (order > 0) {
      key = name;
      hasKey = true;
      usable = reader_.isUsableKey(key);
    }
    previousDay = day;
    if (!usable) continue;
    if (!scalars.isInteger(1) || !scalars.isInteger(2)) {
      reader_.noteForeignRow();
      continue;
    }
    row(key, static_cast<DayNumber>(scalars.integer(1)), scalars.integer(2), stop);
    if (stop) return;
  }
  reader_.noteEnd(code);
}

void LinuxOpenHistory::enumerateDistributions(std::string_view keyPrefix, DayNumber minimumDay,
                                              DayNumber maximumDay, const DistributionRowCallback& row) {
  if (!reader_.isOpen()) return;
  SqliteStatement keys = reader_.database().prepare(kKeys);
  SqliteStatement values = reader_.database().prepare(kValues);
  DayWalk days(reader_, minimumDay, maximumDay);
  std::string end;
  bindPrefix(keys, keyPrefix, end);

  std::string key;
  bool hasKey = false;
  int code = SQLITE_DONE;
  while ((code = keys.step()) == SQLITE_ROW) {
    const std::string_view name = keys.text(0);
    if (hasKey && name <= key) return reader_.noteDisorder();
    key = name;
    hasKey = true;
    days.start(keys.integer(1));
    if (!enumerateDays(key, keys.integer(1), days, values, row)) return;
  }
  reader_.noteEnd(code);
}

// False when the enumeration is at its end, wanted or not.
bool LinuxOpenHistory::enumerateDays(std::string_view key, std::int64_t keyId, DayWalk& days,
                                     SqliteStatement& values, const DistributionRowCallback& row) {
  DayNumber day = 0;
  int code = SQLITE_DONE;
  while ((code = days.advance(day)) == SQLITE_ROW) {
    if (!reader_.isUsableKey(key)) return true;
    StoredValues enumerator(reader_, values, keyId, day);
    bool stop = false;
    row(key, day, enumerator, stop);
    if (stop || enumerator.failed()) return false;
  }
  return code == SQLITE_DONE;
}

class EmptyHistory : public OpenAnalyticsHistory {
 public:
  void enumerateScalars(std::string_view, DayNumber, DayNumber, const ScalarRowCallback&) override {}
  void enumerateDistributions(std::string_view, DayNumber, DayNumber,
                              const DistributionRowCallback&) override {}
  bool isWhole() const override { return true; }
};

}  // namespace

SqliteAnalyticsHistory::SqliteAnalyticsHistory(AnalyticsStoreLocator locate)
    : SqliteAnalyticsHistory(std::move(locate), openStoreForReading) {}

SqliteAnalyticsHistory::SqliteAnalyticsHistory(AnalyticsStoreLocator locate,
                                               std::function<OpenedStore(const StorePlace&)> open)
    : locate_(std::move(locate)), open_(std::move(open)) {}

std::unique_ptr<OpenAnalyticsHistory> SqliteAnalyticsHistory::open() {
  std::optional<StorePlace> place = locate_();
  if (!place) return std::make_unique<EmptyHistory>();
  OpenedStore store = open_(*place);
  if (!store.result.ok()) noteOnce(store.result.error);
  if (!store.database.isOpen()) return std::make_unique<EmptyHistory>();
  return std::make_unique<LinuxOpenHistory>(std::move(store.database), std::move(*place));
}

}  // namespace tbdaily

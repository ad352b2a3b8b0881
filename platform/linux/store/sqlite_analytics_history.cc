#include "platform/linux/store/sqlite_analytics_history.h"

#include <sqlite3.h>

#include <algorithm>
#include <cmath>
#include <deque>
#include <limits>
#include <optional>
#include <string>
#include <utility>

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace {

// In the order of the tables: nothing is sorted.
constexpr std::string_view kScalarRows =
    "SELECT key_id, day, value FROM scalars WHERE (key_id, day) >= (?1, ?2) ORDER BY key_id, day";
constexpr std::string_view kDistributionRows =
    "SELECT key_id, day, 0 FROM distribution_values WHERE (key_id, day) >= (?1, ?2) ORDER BY key_id, day";
constexpr std::string_view kKeys = "SELECT name, id FROM keys WHERE name >= ?1 AND name < ?2 ORDER BY name";
constexpr std::string_view kValues =
    "SELECT seq, seconds, value FROM distribution_values WHERE key_id = ?1 AND day = ?2 ORDER BY seq";
constexpr std::string_view kVisitedValues =
    "SELECT visit(seq, seconds, value) FROM distribution_values WHERE key_id = ?1 AND day = ?2";

// Rows of other days that are stepped over before they are jumped over. A distribution has many of each day.
constexpr unsigned kScalarPatience = 4;
constexpr unsigned kDistributionPatience = 0;

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

// The rows of a table that are of the asked days, in order of key and day. Held for all keys, since their
// names come in another order: 24 bytes a row.
class DayRows {
 public:
  struct Row {
    std::int64_t keyId;
    std::int64_t value;
    DayNumber day;
  };

  DayRows(Reader& reader, std::string_view sql, unsigned patience, DayNumber minimumDay, DayNumber maximumDay)
      : reader_(reader),
        rowsFrom_(reader.database().prepare(sql)),
        mostPatience_(patience),
        patience_(patience),
        minimumDay_(minimumDay),
        maximumDay_(maximumDay) {}

  // False when the table could not be read to its end, which has been noted.
  bool read() {
    std::optional<Place> from = Place{std::numeric_limits<std::int64_t>::min(), double(minimumDay_)};
    while (from) {
      std::optional<Place> next;
      if (!readFrom(*from, next)) return false;
      from = next;
    }
    return true;
  }

  // Those of one key, by day: from the first on as long as isOf holds.
  auto firstOf(std::int64_t keyId) const { return std::ranges::lower_bound(rows_, keyId, {}, &Row::keyId); }
  bool isOf(const std::deque<Row>::const_iterator& row, std::int64_t keyId) const {
    return row != rows_.end() && row->keyId == keyId;
  }

 private:
  // In the order of the table. A foreign program may have left days with a fraction.
  struct Place {
    std::int64_t keyId;
    double day;
    friend bool operator<(const Place& a, const Place& b) {
      return a.keyId != b.keyId ? a.keyId < b.keyId : a.day < b.day;
    }
  };

  // Reads on from a place until rows of other days had better be jumped over, to `next`, or to the end.
  bool readFrom(const Place& from, std::optional<Place>& next) {
    const StatementRun run(rowsFrom_);
    rowsFrom_.bind(1, from.keyId);
    rowsFrom_.bind(2, from.day);
    Place last = from;
    unsigned stepped = 0;
    int code = SQLITE_DONE;
    for (bool isFirst = true; (code = rowsFrom_.step()) == SQLITE_ROW; isFirst = false) {
      if (!rowsFrom_.isInteger(0)) {
        next = behindForeignKey();
        return true;
      }
      // Texts come behind all numbers.
      const double day = rowsFrom_.isNumber(1) ? rowsFrom_.real(1) : HUGE_VAL;
      const Place place{rowsFrom_.integer(0), day};
      const bool isAsked = day >= minimumDay_ && day <= maximumDay_;
      if (place < last || (isAsked && !isFirst && !(last < place))) {
        reader_.noteDisorder();
        return false;
      }
      last = place;
      if (isAsked) add();
      if (isAsked && mostPatience_ != 0) {
        if (stepped != 0) patience_ = mostPatience_;
        stepped = 0;
      } else if (stepped++ == patience_) {
        if (patience_ != 0)
          --patience_;  // it was in vain, as it will be at the next key of a store of many days
        next = behind(place);
        return true;
      }
    }
    reader_.noteEnd(code);
    return code == SQLITE_DONE;
  }

  void add() {
    if (!rowsFrom_.isInteger(1) || !rowsFrom_.isInteger(2)) return reader_.noteForeignRow();
    rows_.push_back(
        {rowsFrom_.integer(0), rowsFrom_.integer(2), static_cast<DayNumber>(rowsFrom_.integer(1))});
  }

  // The key's next day of those that are asked for, or the next key's first one.
  std::optional<Place> behind(const Place& place) const {
    if (place.day < minimumDay_) return Place{place.keyId, double(minimumDay_)};
    if (place.day < maximumDay_) return Place{place.keyId, std::floor(place.day) + 1};
    if (place.keyId == std::numeric_limits<std::int64_t>::max()) return std::nullopt;
    return Place{place.keyId + 1, double(minimumDay_)};
  }
  // No name has such a key: a number with a fraction or out of range, or a text, behind all of them.
  std::optional<Place> behindForeignKey() const {
    const double key = rowsFrom_.isNumber(0) ? std::floor(rowsFrom_.real(0)) : HUGE_VAL;
    if (key >= 0x1p63) return std::nullopt;
    return behind({static_cast<std::int64_t>(key), HUGE_VAL});
  }

  Reader& reader_;
  SqliteStatement rowsFrom_;
  const unsigned mostPatience_;
  unsigned patience_;
  const DayNumber minimumDay_, maximumDay_;
  std::deque<Row> rows_;
};

// What reads the values of a key and day: where they are asked for one by one, and where all are wanted.
struct ValueStatements {
  SqliteStatement oneByOne, all;
};

// The values of one key and day. Asks the store for none of them before the first is wanted.
class StoredValues : public DistributionEnumerator {
 public:
  StoredValues(Reader& reader, ValueStatements& statements, std::int64_t keyId, DayNumber day)
      : reader_(reader), statements_(statements), keyId_(keyId), day_(day) {}

  bool nextValue(double& value, std::int32_t& secondsInDay) override {
    if (ended_) return false;
    SqliteStatement& one = statements_.oneByOne;
    if (!run_) start(one);
    int code = SQLITE_DONE;
    while ((code = one.step()) == SQLITE_ROW) {
      switch (judge(one)) {
        case Verdict::Value:
          secondsInDay = static_cast<std::int32_t>(one.integer(1));
          value = valueOf(one);
          return true;
        case Verdict::Foreign:
          continue;
        case Verdict::End:
          return end(false);
        case Verdict::Disorder:
          return end(true);
      }
    }
    reader_.noteEnd(code);
    return end(code != SQLITE_DONE);
  }

  // The rest of them.
  void visitValues(const DistributionVisitor& visit) override {
    if (run_ || ended_) return DistributionEnumerator::visitValues(visit);
    SqliteStatement& all = statements_.all;
    start(all);
    Verdict last = Verdict::Value;
    const int code = reader_.database().visitRows(all, [&](const SqliteRow& row) {
      last = judge(row);
      if (last == Verdict::Value) visit(valueOf(row), static_cast<std::int32_t>(row.integer(1)));
      return last == Verdict::Value || last == Verdict::Foreign;
    });
    const bool isAtEnd = last == Verdict::End || last == Verdict::Disorder;
    if (!isAtEnd) reader_.noteEnd(code);
    end(isAtEnd ? last == Verdict::Disorder : code != SQLITE_DONE);
  }

  bool failed() const { return failed_; }

 private:
  enum class Verdict : std::uint8_t { Value, Foreign, End, Disorder };

  void start(SqliteStatement& statement) {
    run_.emplace(statement);
    statement.bind(1, keyId_);
    statement.bind(2, std::int64_t{day_});
  }
  // Of a row of sequence, seconds and value; notes what is not as it should be.
  template <typename Row>
  Verdict judge(const Row& row) {
    if (!row.isInteger(0)) {  // behind all that are integers
      reader_.noteForeignRow();
      return Verdict::End;
    }
    const std::int64_t sequence = row.integer(0);
    if (hasSequence_ && sequence <= sequence_) {
      reader_.noteDisorder();
      return Verdict::Disorder;
    }
    hasSequence_ = true;
    sequence_ = sequence;
    if (row.isInteger(1) && isInt32(row.integer(1))) return Verdict::Value;
    reader_.noteForeignRow();
    return Verdict::Foreign;
  }
  template <typename Row>
  static double valueOf(const Row& row) {
    return row.isNumber(2) ? row.real(2) : std::numeric_limits<double>::quiet_NaN();
  }
  bool end(bool failed) {
    ended_ = true;
    failed_ = failed;
    return false;
  }

  Reader& reader_;
  ValueStatements& statements_;
  std::optional<StatementRun> run_;
  std::int64_t keyId_;
  DayNumber day_;
  std::int64_t sequence_ = 0;
  bool hasSequence_ = false;
  bool ended_ = false;
  bool failed_ = false;
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
  // Calls `row` with each of the rows and its key's name, in order of name and day, until it answers false.
  template <typename RowCallback>
  void enumerate(std::string_view keyPrefix, const DayRows& rows, RowCallback&& row);

  Reader reader_;
};

template <typename RowCallback>
void LinuxOpenHistory::enumerate(std::string_view keyPrefix, const DayRows& rows, RowCallback&& row) {
  SqliteStatement keys = reader_.database().prepare(kKeys);
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
    const std::int64_t keyId = keys.integer(1);
    auto each = rows.firstOf(keyId);
    if (!rows.isOf(each, keyId) || !reader_.isUsableKey(key)) continue;
    for (; rows.isOf(each, keyId); ++each) {
      if (!row(std::string_view(key), *each)) return;
    }
  }
  reader_.noteEnd(code);
}

void LinuxOpenHistory::enumerateScalars(std::string_view keyPrefix, DayNumber minimumDay,
                                        DayNumber maximumDay, const ScalarRowCallback& row) {
  if (!reader_.isOpen()) return;
  DayRows rows(reader_, kScalarRows, kScalarPatience, minimumDay, maximumDay);
  if (!rows.read()) return;
  enumerate(keyPrefix, rows, [&row](std::string_view key, const DayRows::Row& scalar) {
    bool stop = false;
    row(key, scalar.day, scalar.value, stop);
    return !stop;
  });
}

void LinuxOpenHistory::enumerateDistributions(std::string_view keyPrefix, DayNumber minimumDay,
                                              DayNumber maximumDay, const DistributionRowCallback& row) {
  if (!reader_.isOpen()) return;
  DayRows rows(reader_, kDistributionRows, kDistributionPatience, minimumDay, maximumDay);
  if (!rows.read()) return;
  ValueStatements statements{reader_.database().prepare(kValues), reader_.database().prepare(kVisitedValues)};
  enumerate(keyPrefix, rows, [&](std::string_view key, const DayRows::Row& distribution) {
    StoredValues values(reader_, statements, distribution.keyId, distribution.day);
    bool stop = false;
    row(key, distribution.day, values, stop);
    return !stop && !values.failed();
  });
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

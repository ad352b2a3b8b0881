// The analytics store as its writers see it: scalars and distribution values by key and day.
//
// Opens its file at first use and makes it at the first write. Each operation is one transaction and, between
// programs, atomic; between beginLoad and commitLoad all operations are one. A failed operation changes
// nothing. A store that another program keeps locked is waited for, once. Operations may come
// from several threads; a load is one thread's.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <mutex>
#include <span>
#include <string>
#include <string_view>
#include <unordered_map>

#include "platform/analytics_client.h"
#include "platform/keyed_hash.h"
#include "platform/linux/store/store_file.h"

namespace tbdaily {

// How many rows a pruning removed.
struct PrunedRows {
  std::int64_t scalars = 0;
  std::int64_t distributionValues = 0;
  std::int64_t keys = 0;  // those that were left without rows
};

// Whether the rows are removed, or only counted.
enum class Pruning : bool { Remove, Rehearse };

class AnalyticsStore {
 public:
  explicit AnalyticsStore(StorePlace place) : place_(std::move(place)) {}

  // On the host, for messages.
  std::filesystem::path file() const { return place_.file(); }

  StoreResult setScalar(std::string_view key, DayNumber day, std::int64_t value);
  // An absent value counts as 0; wraps at 64 bits.
  StoreResult addScalar(std::string_view key, DayNumber day, std::int64_t increment);
  // Puts the values behind those that the key and day have. Not a number is kept as such.
  StoreResult appendDistributionValues(std::string_view key, DayNumber day, std::int32_t secondsInDay,
                                       std::span<const double> values);

  StoreResult beginLoad();
  StoreResult commitLoad();
  // Forgets what was loaded: what is left to do after a failure within a load. Does nothing without one.
  void rollbackLoad();

  // Removes the rows of the days before this one. A store that is missing stays so.
  StoreResult prune(DayNumber beforeDay, Pruning pruning, PrunedRows& pruned);
  // Makes everything that was written so far durable and truncates the write-ahead log.
  StoreResult checkpoint();

 private:
  enum Query : std::size_t {
    FindKey,
    InsertKey,
    FindScalar,
    SetScalar,
    FindLastSequence,
    InsertValue,
    PruneScalars,
    PruneValues,
    PruneKeys,
    QueryCount
  };
  static const std::array<std::string_view, QueryCount> kQueries;

  // What a load knows of a key, so that most lines need no look-up.
  struct LoadedKey {
    std::int64_t id = 0;
    bool mayHaveScalars = true;  // not when it was made a moment ago
    bool hasSequence = false;
    DayNumber day = 0;  // of the sequence
    std::int64_t nextSequence = 0;
  };

  StoreResult open(MissingStore missing);
  template <typename Write>  // int(LoadedKey&): a result code of SQLite
  StoreResult writeRow(std::string_view key, const Write& write);
  enum class Ending : bool { Commit, RollBack };
  template <typename Body>  // int(): the same
  StoreResult transaction(const Body& body, Ending ending = Ending::Commit);
  void endLoad();
  StoreResult commit();
  void rollback();
  StoreResult failure(int code);
  StoreResult brokenOff() const;
  StoreResult succeeded();
  void close();
  SqliteStatement& statement(Query query);

  int findOrInsertKey(std::string_view key, LoadedKey& entry);
  int loadedKey(std::string_view key, LoadedKey*& entry);
  void forgetLoadedKeys();
  int putScalar(LoadedKey& key, DayNumber day, std::int64_t value);
  int putValues(LoadedKey& key, DayNumber day, std::int32_t secondsInDay, std::span<const double> values);

  const StorePlace place_;
  std::mutex mutex_;
  SqliteDatabase database_;
  std::array<SqliteStatement, QueryCount> statements_;  // prepared at first use; gone before the database
  bool loading_ = false;
  bool wasKeyNew_ = false;  // the last one that was looked for
  struct KeyHash {
    using is_transparent = void;
    std::size_t operator()(std::string_view key) const { return KeyedHash::of(key); }
  };
  using LoadedKeys = std::unordered_map<std::string, LoadedKey, KeyHash, std::equal_to<>>;
  LoadedKeys loadedKeys_;  // of the load that is under way
  LoadedKeys::value_type* lastLoaded_ = nullptr;
};

}  // namespace tbdaily

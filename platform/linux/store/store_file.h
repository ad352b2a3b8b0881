// The analytics store's file: how it is judged before anything touches it, made, and opened.
//
// A file that cannot be used (no database, damaged, of another layout or version) is left byte for byte as it
// is, and nothing is left beside it.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/linux/store/sqlite_database.h"
#include "platform/linux/store/store_place.h"

namespace tbdaily {

inline constexpr std::size_t kLongestAnalyticsKey = 1024;  // bytes

// Why a failed operation on the store failed.
enum class StoreFault {
  None,
  Unusable,     // what lies there is no store of ours, or a damaged one; an administrator has to act
  Locked,       // another program kept it locked
  UnusableKey,  // no key of a store: the write alone is refused
  Failed,       // everything else: no room, no permission
};

struct StoreResult {
  StoreFault fault = StoreFault::None;
  std::string error;    // one line with the reason and, where the store is unusable, what to do
  int systemError = 0;  // the errno value where a folder or the file could not be made

  bool ok() const { return fault == StoreFault::None; }
};

// Why the text cannot be an analytics key: longer than kLongestAnalyticsKey, not UTF-8, or with a character
// that a report in XML cannot carry. Nothing when it can.
std::optional<std::string_view> analyticsKeyFault(std::string_view key);

struct OpenedStore {
  SqliteDatabase database;  // closed when there is no store, or when it cannot be used
  StoreResult result;
};

// A connection in a read transaction. A store that is missing or new (empty) gives a closed connection
// without a fault.
OpenedStore openStoreForReading(const StorePlace& place);

// The same over a copy of the store that has no name: its file and the log that belongs to it, which is
// written back. `original` is what messages tell of.
OpenedStore openStoreCopy(FileDescriptor file, FileDescriptor log, const StorePlace& original);

enum class MissingStore { Leave, Create };

// A connection that writes to a write-ahead log. A missing store is made (folders of mode 0700, file of mode
// 0600) or gives a closed connection without a fault.
OpenedStore openStoreForWriting(const StorePlace& place, MissingStore missing);

// What the last failed operation on the connection means; the store's condition remembers it.
StoreResult storeFailure(const SqliteDatabase& database, const StorePlace& place);
StoreResult unusableStore(const StorePlace& place, std::string_view reason);

// The name of the write-ahead log beside the file.
std::string storeLogOf(const std::string& name);

}  // namespace tbdaily

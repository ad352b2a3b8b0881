// SQLite behind owning types: a connection, a prepared statement, and the time for which a statement runs.
//
// Result codes are SQLite's own (SQLITE_OK is 0), with the extended bits dropped. Not for several threads at
// once.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/linux/base/device_files.h"

struct sqlite3;
struct sqlite3_stmt;
struct sqlite3_value;

namespace tbdaily {

class SqliteStatement {
 public:
  SqliteStatement() = default;
  explicit SqliteStatement(sqlite3_stmt* statement) : statement_(statement) {}

  explicit operator bool() const { return statement_ != nullptr; }

  // Parameters count from 1, columns from 0. A bound text is borrowed until the statement is reset.
  void bind(int parameter, std::int64_t value);
  void bind(int parameter, double value);  // not a number is bound as NULL
  void bind(int parameter, std::string_view text);
  // Binds an empty blob, which is greater than every text.
  void bindAboveEveryText(int parameter);

  // SQLITE_ROW, SQLITE_DONE, or what went wrong. A statement that could not be prepared answers
  // SQLITE_MISUSE.
  int step();
  void reset();

  bool isInteger(int column) const;
  bool isNumber(int column) const;  // an integer or a real
  std::int64_t integer(int column) const;
  double real(int column) const;
  // Borrowed until the next step or reset.
  std::string_view text(int column) const;

 private:
  struct Finalizer {
    void operator()(sqlite3_stmt* statement) const;
  };
  std::unique_ptr<sqlite3_stmt, Finalizer> statement_;
};

// The arguments of `visit` in a statement, for the time of one call.
class SqliteRow {
 public:
  explicit SqliteRow(sqlite3_value** values) : values_(values) {}

  bool isInteger(int column) const;
  bool isNumber(int column) const;  // an integer or a real
  std::int64_t integer(int column) const;
  double real(int column) const;

 private:
  sqlite3_value** values_;
};

// Answers whether it wants the next row.
using SqliteRowVisitor = std::function<bool(const SqliteRow& row)>;

// Resets a statement at the end of a block, so that it holds no lock and no borrowed text afterwards.
class StatementRun {
 public:
  explicit StatementRun(SqliteStatement& statement) : statement_(statement) {}
  ~StatementRun() { statement_.reset(); }
  StatementRun(const StatementRun&) = delete;
  StatementRun& operator=(const StatementRun&) = delete;

 private:
  SqliteStatement& statement_;
};

enum class SqliteMode {
  ReadWrite,
  ReadOnly,
  // Takes no lock, looks at no log and makes no file: for a file that nobody changes meanwhile.
  Immutable,
};

class SqliteDatabase {
 public:
  SqliteDatabase();
  SqliteDatabase(SqliteDatabase&& other) noexcept;
  SqliteDatabase& operator=(SqliteDatabase&& other) noexcept;
  ~SqliteDatabase();

  // Opens a file that exists. What its schema holds is not trusted: no triggers, no views, no unsafe
  // functions.
  // What it opens are regular files of that folder without a second name, whatever becomes of the names
  // meanwhile.
  int open(std::shared_ptr<const DeviceFolder> folder, const std::string& name, SqliteMode mode,
           std::chrono::milliseconds busyTimeout);
  // Opens a file without a name, and the write-ahead log that belongs to it, for this process alone.
  int openUnnamed(FileDescriptor file, FileDescriptor log);
  // Opens, for reading, what such a file holds, without a look at a log beside it.
  int openImage(std::vector<std::byte> image);
  void setBusyTimeout(std::chrono::milliseconds busyTimeout);
  // Closing then leaves the write-ahead log as it is.
  void keepLogOnClose();
  void close();

  bool isOpen() const { return connection_ != nullptr; }
  // Whether it reads memory, and not a file.
  bool isImage() const { return isOpen() && !image_.empty(); }
  // Whether a statement outside of a transaction would commit by itself.
  bool isOutsideTransaction() const;
  // Whether the path leads to another file than the one that is open.
  bool hasMoved() const;
  std::int64_t changedRows() const;  // by the last statement
  std::int64_t lastInsertedRow() const;

  // Runs a statement "SELECT visit(A, B, ...) FROM ..." and calls `visitor` with each of its rows: quicker
  // than one step for each, where all are wanted. SQLITE_DONE at the end, SQLITE_ABORT where the visitor
  // ended it, or what went wrong. Passes on what the visitor throws.
  int visitRows(SqliteStatement& statement, const SqliteRowVisitor& visitor);

  int execute(const char* sql);
  SqliteStatement prepare(std::string_view sql);
  // The first column of the first row.
  int queryInteger(std::string_view sql, std::int64_t& value);
  int queryText(std::string_view sql, std::string& value);
  // Writes the log back into the file and truncates it. `complete` is false when a reader kept that from
  // happening in full.
  int truncateLog(bool& complete);

  // The outcome and the reason of the last failed operation, the system's reason included.
  int errorCode() const;
  std::string errorMessage() const;

 private:
  int configure(std::chrono::milliseconds busyTimeout);

  struct Visit;
  std::unique_ptr<Visit> visit_;  // that is under way; the connection knows its place
  struct Closer {
    void operator()(sqlite3* connection) const;
  };
  // Says which file a log is that has no name, as long as its database is open.
  class UnnamedLog;
  struct UnnamedLogCloser {
    void operator()(UnnamedLog* log) const;
  };
  FileDescriptor unnamed_;
  std::unique_ptr<UnnamedLog, UnnamedLogCloser> unnamedLog_;
  std::shared_ptr<const DeviceFolder> folder_;  // stays open for as long as files of it may be opened
  std::vector<std::byte> image_;                // what the connection reads, where it is no file
  std::unique_ptr<sqlite3, Closer> connection_;
};

}  // namespace tbdaily

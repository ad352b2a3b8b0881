#include "platform/linux/store/sqlite_database.h"

#include <fcntl.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <map>
#include <mutex>
#include <optional>
#include <utility>

#include "platform/hexadecimal.h"
#include "platform/linux/base/host_notes.h"

namespace tbdaily {

namespace {

constexpr int kPrimaryCode = 0xff;
// Longer texts and blobs end in SQLITE_TOOBIG instead of being read into memory.
constexpr int kLongestValue = 1 << 20;

// The default file layer of SQLite with two differences: a path is taken as it is (looking for the file that
// it means would leave the folder's descriptor), and what is opened is judged.
constexpr const char* kFileLayer = "device";

// The logs of files without a name, by the path that SQLite makes of the file's: such a path does not exist.
class UnnamedLogs {
 public:
  static UnnamedLogs& all() {
    static UnnamedLogs logs;
    return logs;
  }
  void add(const std::string& path, int file) {
    const std::lock_guard lock(mutex_);
    files_[path] = file;
  }
  void remove(const std::string& path) {
    const std::lock_guard lock(mutex_);
    files_.erase(path);
  }
  std::optional<int> find(std::string_view path) {
    const std::lock_guard lock(mutex_);
    const auto found = files_.find(path);
    return found != files_.end() ? std::optional(found->second) : std::nullopt;
  }

 private:
  std::mutex mutex_;
  std::map<std::string, int, std::less<>> files_;
};

constexpr std::string_view kDescriptors = "/proc/self/fd/";

std::string descriptorPath(int file) {
  return std::string(kDescriptors).append(std::to_string(file));
}
bool isDescriptorPath(std::string_view path) {
  return path.starts_with(kDescriptors) && path.find('/', kDescriptors.size()) == path.npos;
}

// Opens a regular file or a folder alone. Never waits for the other end of a pipe. SQLite calls it with its
// locks held: nothing may be thrown, and so nothing is allocated.
int openJudged(const char* path, int flags, int mode) noexcept {
  std::array<char, 64> logPath;
  if (const auto log = UnnamedLogs::all().find(path)) {
    std::snprintf(logPath.data(), logPath.size(), "%s%d", kDescriptors.data(), *log);
    path = logPath.data();
  }
  if (isDescriptorPath(path))
    flags &= ~(O_NOFOLLOW | O_CREAT);  // the one link that leads to a file without a name
  const int file = ::open(path, flags | O_NONBLOCK | O_NOCTTY | O_CLOEXEC, mode);
  if (file < 0) return file;
  struct stat status {};
  int error = ::fstat(file, &status) == 0 ? 0 : errno;
  const bool isWritten = (flags & O_ACCMODE) != O_RDONLY;
  if (error == 0 && !S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode)) error = kNotARegularFile;
  if (error == 0 && isWritten && status.st_nlink > 1) error = kSecondName;
  if (error == 0) return file;
  ::close(file);
  errno = error;
  return -1;
}

int takePathAsItIs(sqlite3_vfs*, const char* path, int room, char* out) noexcept {
  const std::size_t length = std::strlen(path) + 1;
  if (length > static_cast<std::size_t>(room)) return SQLITE_CANTOPEN;
  std::memcpy(out, path, length);
  return SQLITE_OK;
}

sqlite3_vfs* usualFileLayer() {
  static sqlite3_vfs* const usual = (sqlite3_initialize(), sqlite3_vfs_find(nullptr));
  return usual;
}

int knowUnnamedLogs(sqlite3_vfs*, const char* path, int question, int* answer) noexcept {
  const auto log = UnnamedLogs::all().find(path);
  if (!log) return usualFileLayer()->xAccess(usualFileLayer(), path, question, answer);
  struct stat status {};
  *answer = ::fstat(*log, &status) == 0 && status.st_size > 0 ? 1 : 0;
  return SQLITE_OK;
}

int registerFileLayer() {
  static const int result = [] {
    sqlite3_vfs* usual = usualFileLayer();
    if (usual == nullptr || usual->iVersion < 3) return SQLITE_ERROR;
    usual->xSetSystemCall(usual, "open", reinterpret_cast<sqlite3_syscall_ptr>(openJudged));
    static sqlite3_vfs layer = *usual;
    layer.zName = kFileLayer;
    layer.xFullPathname = takePathAsItIs;
    layer.xAccess = knowUnnamedLogs;
    return sqlite3_vfs_register(&layer, 0);
  }();
  return result;
}

std::string fileUri(const std::filesystem::path& file, SqliteMode mode) {
  constexpr std::string_view kPlain = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-._~/";
  std::string uri = "file:";
  for (const char c : file.native()) {
    if (kPlain.find(c) != std::string_view::npos) {
      uri += c;
      continue;
    }
    uri += '%';
    appendHexadecimal(uri, std::as_bytes(std::span(&c, 1)), HexadecimalCase::Upper);
  }
  if (mode == SqliteMode::Immutable) uri += "?immutable=1";
  return uri;
}

}  // namespace

void SqliteStatement::Finalizer::operator()(sqlite3_stmt* statement) const {
  sqlite3_finalize(statement);
}

void SqliteStatement::bind(int parameter, std::int64_t value) {
  sqlite3_bind_int64(statement_.get(), parameter, value);
}

void SqliteStatement::bind(int parameter, double value) {
  sqlite3_bind_double(statement_.get(), parameter, value);
}

void SqliteStatement::bind(int parameter, std::string_view text) {
  // A null pointer would be bound as NULL, and a null destructor says that the text is borrowed.
  const char* bytes = text.data() != nullptr ? text.data() : "";
  sqlite3_bind_text64(statement_.get(), parameter, bytes, text.size(), nullptr, SQLITE_UTF8);
}

void SqliteStatement::bindAboveEveryText(int parameter) {
  sqlite3_bind_zeroblob(statement_.get(), parameter, 0);
}

int SqliteStatement::step() {
  return statement_ ? sqlite3_step(statement_.get()) & kPrimaryCode : SQLITE_MISUSE;
}

void SqliteStatement::reset() {
  sqlite3_reset(statement_.get());
  if (statement_) sqlite3_clear_bindings(statement_.get());
}

bool SqliteStatement::isInteger(int column) const {
  return sqlite3_column_type(statement_.get(), column) == SQLITE_INTEGER;
}

bool SqliteStatement::isNumber(int column) const {
  const int type = sqlite3_column_type(statement_.get(), column);
  return type == SQLITE_INTEGER || type == SQLITE_FLOAT;
}

std::int64_t SqliteStatement::integer(int column) const {
  return sqlite3_column_int64(statement_.get(), column);
}

double SqliteStatement::real(int column) const {
  return sqlite3_column_double(statement_.get(), column);
}

std::string_view SqliteStatement::text(int column) const {
  // A blob of the same bytes: no conversion, and no terminator that may need a copy.
  const void* bytes = sqlite3_column_blob(statement_.get(), column);
  const int length = sqlite3_column_bytes(statement_.get(), column);
  if (bytes == nullptr || length <= 0) return {};
  return {static_cast<const char*>(bytes), static_cast<std::size_t>(length)};
}

bool SqliteRow::isInteger(int column) const {
  return sqlite3_value_type(values_[column]) == SQLITE_INTEGER;
}

bool SqliteRow::isNumber(int column) const {
  const int type = sqlite3_value_type(values_[column]);
  return type == SQLITE_INTEGER || type == SQLITE_FLOAT;
}

std::int64_t SqliteRow::integer(int column) const {
  return sqlite3_value_int64(values_[column]);
}

double SqliteRow::real(int column) const {
  return sqlite3_value_double(values_[column]);
}

struct SqliteDatabase::Visit {
  const SqliteRowVisitor* visitor = nullptr;
  std::exception_ptr thrown;

  // The step of an aggregate function. No exception may pass through SQLite.
  static void row(sqlite3_context* context, int, sqlite3_value** values) {
    auto& visit = *static_cast<Visit*>(sqlite3_user_data(context));
    try {
      if ((*visit.visitor)(SqliteRow(values))) return;
    } catch (...) {
      visit.thrown = std::current_exception();
    }
    sqlite3_result_error_code(context, SQLITE_ABORT);
  }
  static void end(sqlite3_context*) {}
};

int SqliteDatabase::visitRows(SqliteStatement& statement, const SqliteRowVisitor& visitor) {
  visit_->visitor = &visitor;
  visit_->thrown = nullptr;
  int code = SQLITE_ROW;
  while (code == SQLITE_ROW) code = statement.step();
  visit_->visitor = nullptr;
  if (visit_->thrown) std::rethrow_exception(std::exchange(visit_->thrown, nullptr));
  return code;
}

SqliteDatabase::SqliteDatabase() = default;
SqliteDatabase::SqliteDatabase(SqliteDatabase&& other) noexcept = default;
SqliteDatabase::~SqliteDatabase() = default;

SqliteDatabase& SqliteDatabase::operator=(SqliteDatabase&& other) noexcept {
  // A connection goes before what it reads.
  close();
  unnamed_ = std::move(other.unnamed_);
  unnamedLog_ = std::move(other.unnamedLog_);
  folder_ = std::move(other.folder_);
  image_ = std::move(other.image_);
  visit_ = std::move(other.visit_);
  connection_ = std::move(other.connection_);
  return *this;
}

void SqliteDatabase::close() {
  connection_.reset();
  unnamedLog_.reset();
  unnamed_.reset();
  folder_.reset();
  image_ = {};
}

void SqliteDatabase::Closer::operator()(sqlite3* connection) const {
  sqlite3_close_v2(connection);
}

int SqliteDatabase::open(std::shared_ptr<const DeviceFolder> folder, const std::string& name, SqliteMode mode,
                         std::chrono::milliseconds busyTimeout) {
  if (const int code = registerFileLayer(); code != SQLITE_OK) return code;
  const int flags = (mode == SqliteMode::ReadWrite ? SQLITE_OPEN_READWRITE : SQLITE_OPEN_READONLY) |
                    SQLITE_OPEN_URI | SQLITE_OPEN_NOMUTEX;
  sqlite3* connection = nullptr;
  const std::string uri = fileUri(folder->throughDescriptor(name), mode);
  close();
  folder_ = std::move(folder);
  const int code = sqlite3_open_v2(uri.c_str(), &connection, flags, kFileLayer);
  connection_.reset(connection);
  return code == SQLITE_OK ? configure(busyTimeout) : code & kPrimaryCode;
}

class SqliteDatabase::UnnamedLog {
 public:
  UnnamedLog(std::string path, FileDescriptor file) : path_(std::move(path)), file_(std::move(file)) {
    UnnamedLogs::all().add(path_, file_.get());
  }
  ~UnnamedLog() { UnnamedLogs::all().remove(path_); }
  UnnamedLog(const UnnamedLog&) = delete;
  UnnamedLog& operator=(const UnnamedLog&) = delete;

 private:
  const std::string path_;
  const FileDescriptor file_;
};

void SqliteDatabase::UnnamedLogCloser::operator()(UnnamedLog* log) const {
  delete log;
}

int SqliteDatabase::openUnnamed(FileDescriptor file, FileDescriptor log) {
  if (const int code = registerFileLayer(); code != SQLITE_OK) return code;
  close();
  unnamed_ = std::move(file);
  const std::string path = descriptorPath(unnamed_.get());
  unnamedLog_.reset(new UnnamedLog(path + "-wal", std::move(log)));
  sqlite3* connection = nullptr;
  const int code =
      sqlite3_open_v2(path.c_str(), &connection, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, kFileLayer);
  connection_.reset(connection);
  if (code != SQLITE_OK) return code & kPrimaryCode;
  if (const int configured = configure({}); configured != SQLITE_OK) return configured;
  keepLogOnClose();
  // Nobody else can have it open: no shared index.
  return execute("PRAGMA locking_mode = EXCLUSIVE");
}

int SqliteDatabase::openImage(std::vector<std::byte> image) {
  // The two bytes that ask for a write-ahead log, which memory has no place for.
  constexpr std::size_t kWriteVersion = 18, kReadVersion = 19;
  constexpr std::byte kWithoutLog{1}, kWithLog{2};
  for (const std::size_t version : {kWriteVersion, kReadVersion}) {
    if (image.size() > version && image[version] == kWithLog) image[version] = kWithoutLog;
  }
  close();
  image_ = std::move(image);
  sqlite3* connection = nullptr;
  int code = sqlite3_open_v2(":memory:", &connection, SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX, nullptr);
  connection_.reset(connection);
  const auto size = static_cast<sqlite3_int64>(image_.size());
  if (code == SQLITE_OK) {
    code = sqlite3_deserialize(connection, "main", reinterpret_cast<unsigned char*>(image_.data()), size,
                               size, SQLITE_DESERIALIZE_READONLY);
  }
  return code == SQLITE_OK ? configure({}) : code & kPrimaryCode;
}

int SqliteDatabase::configure(std::chrono::milliseconds busyTimeout) {
  sqlite3* connection = connection_.get();
  setBusyTimeout(busyTimeout);
  sqlite3_limit(connection, SQLITE_LIMIT_LENGTH, kLongestValue);
  sqlite3_db_config(connection, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
  sqlite3_db_config(connection, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
  sqlite3_db_config(connection, SQLITE_DBCONFIG_ENABLE_TRIGGER, 0, nullptr);
  sqlite3_db_config(connection, SQLITE_DBCONFIG_ENABLE_VIEW, 0, nullptr);
  visit_ = std::make_unique<Visit>();
  const int code = sqlite3_create_function_v2(connection, "visit", -1, SQLITE_UTF8 | SQLITE_DIRECTONLY,
                                              visit_.get(), nullptr, Visit::row, Visit::end, nullptr);
  return code == SQLITE_OK ? execute("PRAGMA cell_size_check = ON") : code & kPrimaryCode;
}

void SqliteDatabase::setBusyTimeout(std::chrono::milliseconds busyTimeout) {
  sqlite3_busy_timeout(connection_.get(), static_cast<int>(busyTimeout.count()));
}

void SqliteDatabase::keepLogOnClose() {
  sqlite3_db_config(connection_.get(), SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
}

bool SqliteDatabase::isOutsideTransaction() const {
  return sqlite3_get_autocommit(connection_.get()) != 0;
}

bool SqliteDatabase::hasMoved() const {
  int moved = 0;
  sqlite3_file_control(connection_.get(), "main", SQLITE_FCNTL_HAS_MOVED, &moved);
  return moved != 0;
}

std::int64_t SqliteDatabase::lastInsertedRow() const {
  return sqlite3_last_insert_rowid(connection_.get());
}

std::int64_t SqliteDatabase::changedRows() const {
  return sqlite3_changes64(connection_.get());
}

int SqliteDatabase::execute(const char* sql) {
  return sqlite3_exec(connection_.get(), sql, nullptr, nullptr, nullptr) & kPrimaryCode;
}

SqliteStatement SqliteDatabase::prepare(std::string_view sql) {
  sqlite3_stmt* statement = nullptr;
  sqlite3_prepare_v3(connection_.get(), sql.data(), static_cast<int>(sql.size()), SQLITE_PREPARE_PERSISTENT,
                     &statement, nullptr);
  return SqliteStatement(statement);
}

int SqliteDatabase::queryInteger(std::string_view sql, std::int64_t& value) {
  SqliteStatement statement = prepare(sql);
  if (!statement) return errorCode();
  const int code = statement.step();
  if (code == SQLITE_ROW) value = statement.integer(0);
  return code == SQLITE_ROW || code == SQLITE_DONE ? SQLITE_OK : code;
}

int SqliteDatabase::queryText(std::string_view sql, std::string& value) {
  SqliteStatement statement = prepare(sql);
  if (!statement) return errorCode();
  const int code = statement.step();
  if (code == SQLITE_ROW) value = statement.text(0);
  return code == SQLITE_ROW || code == SQLITE_DONE ? SQLITE_OK : code;
}

int SqliteDatabase::truncateLog(bool& complete) {
  const int code =
      sqlite3_wal_checkpoint_v2(connection_.get(), "main", SQLITE_CHECKPOINT_TRUNCATE, nullptr, nullptr) &
      kPrimaryCode;
  complete = code == SQLITE_OK;
  return code == SQLITE_BUSY ? SQLITE_OK : code;
}

int SqliteDatabase::errorCode() const {
  return sqlite3_errcode(connection_.get()) & kPrimaryCode;
}

std::string SqliteDatabase::errorMessage() const {
  std::string message = sqlite3_errmsg(connection_.get());
  const int code = errorCode();
  const int systemError = sqlite3_system_errno(connection_.get());
  if ((code == SQLITE_CANTOPEN || code == SQLITE_IOERR) && systemError != 0) {
    message.append(" (").append(errorText(systemError)).append(")");
  }
  return message;
}

}  // namespace tbdaily

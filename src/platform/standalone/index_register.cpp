#include <fcntl.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <ctime>
#include <memory>
#include <mutex>
#include <string_view>
#include <thread>

#include "platform/standalone/index_schema.h"
#include "platform/standalone/last_error.h"
#include "platform/velaindex.h"
#include "posix/deadline.h"
#include "posix/file_descriptor.h"

namespace {

using vela::Fail;

/// The index tells the names of everybody's photos, also of those in closed directories.
constexpr mode_t kDirectoryMode = 0750;
constexpr mode_t kFileMode = 0640;

struct CloseDatabase {
  void operator()(sqlite3* database) const { sqlite3_close_v2(database); }
};
struct FinalizeStatement {
  void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
};
using DatabaseHandle = std::unique_ptr<sqlite3, CloseDatabase>;
using StatementHandle = std::unique_ptr<sqlite3_stmt, FinalizeStatement>;

int ToErrno(int sqliteCode) {
  constexpr int kPrimaryCode = 0xff;
  switch (sqliteCode & kPrimaryCode) {
    case SQLITE_OK:
    case SQLITE_DONE:
    case SQLITE_ROW:
      return 0;
    case SQLITE_BUSY:
    case SQLITE_LOCKED:
      return EBUSY;
    case SQLITE_CANTOPEN:
    case SQLITE_PERM:
    case SQLITE_READONLY:
      return EACCES;
    case SQLITE_FULL:
      return ENOSPC;
    case SQLITE_NOMEM:
      return ENOMEM;
    default:
      return EIO;
  }
}

/// Makes the database's directory, with its mode whatever the process's mask. Returns whether it is
/// there, also when another process was faster.
bool MakeDirectory() {
  if (mkdir(vela::kIndexDirectory, kDirectoryMode) != 0) return errno == EEXIST;
  return chmod(vela::kIndexDirectory, kDirectoryMode) == 0;
}

int CreateNewFile() {
  return open(vela::kIndexDatabase, O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, kFileMode);
}

/// Makes the database's file, empty, when it is missing, with its mode whatever the process's mask:
/// the library would leave that to the mask. A failure shows when the file is opened.
void MakeFile() {
  int made = CreateNewFile();
  if (made < 0 && errno == ENOENT && MakeDirectory()) made = CreateNewFile();
  const vela::FileDescriptor file(made);
  if (made >= 0) fchmod(made, kFileMode);
}

std::string_view PathOf(const VELA_MEDIA_INFO& media) {
  return {media.path, strnlen(media.path, sizeof(media.path))};
}

/// An open index database.
class IndexDatabase {
 public:
  /// Opens the file, which is made with its directory when missing. Returns 0 or an errno value.
  int Open();

  /// Returns whether the open file is still the one at its path.
  bool IsCurrent() const;

  /// Returns whether this process opened it. A database must not be carried across a fork.
  bool IsOwn() const { return process_ == getpid(); }

  /// Stores the conversion. Returns 0 or an errno value.
  int Store(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail);

 private:
  int OpenFile();
  int Configure();
  int PrepareStatements();
  int CheckVersion(int& version);
  int EnsureTables();
  int MakeTables();
  int BindConversion(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail);
  int StoreInTransaction();
  int Execute(const char* sql);
  int ExecuteOnceFree(const char* sql);
  int Prepare(const char* sql, StatementHandle& statement);
  int Run(const StatementHandle& statement);

  /// Ends the open transaction: for good when `error` is 0. Returns `error`, or that of the end.
  int Finish(int error);

  DatabaseHandle database_;
  StatementHandle begin_;
  StatementHandle version_;
  StatementHandle replace_;
  StatementHandle commit_;
  pid_t process_ = getpid();
};

int IndexDatabase::Execute(const char* sql) {
  return ToErrno(sqlite3_exec(database_.get(), sql, nullptr, nullptr, nullptr));
}

int IndexDatabase::Prepare(const char* sql, StatementHandle& statement) {
  sqlite3_stmt* prepared = nullptr;
  const int code =
      sqlite3_prepare_v3(database_.get(), sql, -1, SQLITE_PREPARE_PERSISTENT, &prepared, nullptr);
  statement.reset(prepared);
  return ToErrno(code);
}

int IndexDatabase::Run(const StatementHandle& statement) {
  sqlite3_step(statement.get());
  return ToErrno(sqlite3_reset(statement.get()));
}

int IndexDatabase::OpenFile() {
  constexpr int kFlags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX;
  sqlite3* database = nullptr;
  const int code = sqlite3_open_v2(vela::kIndexDatabase, &database, kFlags, nullptr);
  database_.reset(database);
  return ToErrno(code);
}

/// The library does not wait for other programs in all statements; this does.
int IndexDatabase::ExecuteOnceFree(const char* sql) {
  constexpr std::chrono::milliseconds kPause(5);
  const auto end =
      vela::Deadline::Clock::now() + std::chrono::milliseconds(vela::kIndexBusyTimeout);
  int error = Execute(sql);
  while (error == EBUSY && vela::Deadline::Clock::now() < end) {
    std::this_thread::sleep_for(kPause);
    error = Execute(sql);
  }
  return error;
}

int IndexDatabase::Configure() {
  sqlite3_busy_timeout(database_.get(), vela::kIndexBusyTimeout);
  // A checkpoint at the close would wait for the disk, and would remove the log by its name even if
  // that belongs to a new database by then.
  sqlite3_db_config(database_.get(), SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
  const int error = ExecuteOnceFree("PRAGMA journal_mode = WAL");
  return error == 0 ? Execute("PRAGMA synchronous = NORMAL") : error;
}

int IndexDatabase::PrepareStatements() {
  int error = Prepare("BEGIN IMMEDIATE", begin_);
  if (error == 0) error = Prepare("PRAGMA user_version", version_);
  if (error == 0) error = Prepare("COMMIT", commit_);
  return error;
}

/// Reads the version of the tables. Returns 0, or an errno value: also for tables that are newer
/// than this program.
int IndexDatabase::CheckVersion(int& version) {
  sqlite3_step(version_.get());
  version = sqlite3_column_int(version_.get(), 0);
  const int error = ToErrno(sqlite3_reset(version_.get()));
  if (error != 0) return error;
  return version > vela::kIndexSchemaVersion ? EPROTONOSUPPORT : 0;
}

int IndexDatabase::Finish(int error) {
  if (error == 0) error = Run(commit_);
  if (error != 0) Execute("ROLLBACK");
  return error;
}

int IndexDatabase::MakeTables() {
  int error = Run(begin_);
  if (error != 0) return error;
  int version = 0;
  error = CheckVersion(version);
  const bool isMissing = version < vela::kIndexSchemaVersion;
  if (error == 0 && isMissing) error = Execute(vela::kIndexSchema);
  return Finish(error);
}

int IndexDatabase::EnsureTables() {
  int version = 0;
  const int error = CheckVersion(version);
  const bool isMissing = version < vela::kIndexSchemaVersion;
  return error == 0 && isMissing ? MakeTables() : error;
}

int IndexDatabase::Open() {
  MakeFile();
  int error = OpenFile();
  if (error == 0) error = Configure();
  if (error == 0) error = PrepareStatements();
  if (error == 0) error = EnsureTables();
  if (error == 0) error = Prepare(vela::kReplaceConversion, replace_);
  return error;
}

bool IndexDatabase::IsCurrent() const {
  int hasMoved = 1;
  const int code = sqlite3_file_control(database_.get(), "main", SQLITE_FCNTL_HAS_MOVED, &hasMoved);
  return code == SQLITE_OK && hasMoved == 0;
}

/// The texts that are bound must stay until the statement has run.
int IndexDatabase::BindConversion(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail) {
  sqlite3_stmt* statement = replace_.get();
  int column = 0;
  int code = SQLITE_OK;
  for (const VELA_MEDIA_INFO* media : {&photo, &thumbnail}) {
    const std::string_view path = PathOf(*media);
    code |= sqlite3_bind_blob64(statement, ++column, path.data(), path.size(), SQLITE_STATIC);
    code |= sqlite3_bind_int64(statement, ++column, media->width);
    code |= sqlite3_bind_int64(statement, ++column, media->height);
  }
  code |= sqlite3_bind_int64(statement, ++column, std::time(nullptr));
  return code == SQLITE_OK ? 0 : EIO;
}

int IndexDatabase::StoreInTransaction() {
  int error = Run(begin_);
  if (error != 0) return error;
  int version = 0;
  error = CheckVersion(version);
  if (error == 0) error = Run(replace_);
  return Finish(error);
}

int IndexDatabase::Store(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail) {
  int error = BindConversion(photo, thumbnail);
  if (error == 0) error = StoreInTransaction();
  sqlite3_clear_bindings(replace_.get());
  return error;
}

/// Keeps the database open between the calls of a process; opening it costs several times what
/// storing does. It is never closed at the end of the process: that has nothing to do that the next
/// program to open the database does not do anyway.
class IndexRegister {
 public:
  /// Returns 0 or an errno value.
  int Store(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail);

 private:
  int EnsureOpen();

  std::mutex mutex_;
  std::unique_ptr<IndexDatabase> database_;
};

int IndexRegister::EnsureOpen() {
  if (database_ && database_->IsCurrent()) return 0;
  database_.reset();
  auto database = std::make_unique<IndexDatabase>();
  const int error = database->Open();
  if (error == 0) database_ = std::move(database);
  return error;
}

int IndexRegister::Store(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail) {
  const std::lock_guard<std::mutex> lock(mutex_);
  if (database_ && !database_->IsOwn()) return ECHILD;
  int error = EnsureOpen();
  if (error != 0) return error;
  error = database_->Store(photo, thumbnail);
  // Whatever it was, the next call shall not inherit it.
  if (error != 0) database_.reset();
  return error;
}

IndexRegister& ProcessRegister() {
  static auto* indexRegister = new IndexRegister;
  return *indexRegister;
}

}  // namespace

int VELAIDX_IndexConvertAdd(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail,
                            const Json::Value& /*extra*/) {
  if (PathOf(photo).empty() || PathOf(thumbnail).empty()) return Fail(EINVAL);
  const int error = ProcessRegister().Store(photo, thumbnail);
  return error == 0 ? 0 : Fail(error);
}

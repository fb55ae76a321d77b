#include <cerrno>
#include <cstring>
#include <ctime>
#include <memory>
#include <mutex>
#include <string_view>

#include "index/index_database.h"
#include "platform/standalone/last_error.h"
#include "platform/velaindex.h"

namespace vela {

namespace {

/// How long a registration waits for the transactions of other programs.
constexpr std::chrono::milliseconds kBusyTimeout(2000);

/// Version of the table below, kept as the database's user_version.
constexpr int kTableVersion = 1;

/// One row for each photo whose thumbnails were made; paths are byte strings, sizes pixels, the
/// time is in seconds since the epoch.
constexpr const char* kCreateTable =
    "CREATE TABLE IF NOT EXISTS conversion ("
    " photo_path BLOB NOT NULL PRIMARY KEY,"
    " photo_width INTEGER NOT NULL,"
    " photo_height INTEGER NOT NULL,"
    " thumbnail_path BLOB NOT NULL,"
    " thumbnail_width INTEGER NOT NULL,"
    " thumbnail_height INTEGER NOT NULL,"
    " registered_at INTEGER NOT NULL"
    ") WITHOUT ROWID;"
    "PRAGMA user_version = 1;";

constexpr const char* kReplaceConversion =
    "INSERT OR REPLACE INTO conversion VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7)";

int ToErrno(int sqliteCode) {
  constexpr int kPrimaryCode = 0xff;
  if (sqliteCode == kNewerTables) {
    return EPROTONOSUPPORT;
  }
  switch (sqliteCode & kPrimaryCode) {
    case SQLITE_OK:
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

std::string_view PathOf(const VELA_MEDIA_INFO& media) {
  return {media.path, strnlen(media.path, sizeof(media.path))};
}

/// The table of conversions in an open database. Functions that return an int return an SQLite
/// result code or kNewerTables.
class ConversionTable {
 public:
  int Open();
  int Store(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail);
  const IndexDatabase& Database() const { return database_; }

 private:
  int ReadVersion(int& version);
  int CheckVersion();
  int BindConversion(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail);
  int StoreInTransaction();

  IndexDatabase database_;
  IndexDatabase::Statement version_;
  IndexDatabase::Statement replace_;
};

int ConversionTable::ReadVersion(int& version) {
  sqlite3_step(version_.get());
  version = sqlite3_column_int(version_.get(), 0);
  return sqlite3_reset(version_.get());
}

int ConversionTable::CheckVersion() {
  int version = 0;
  const int code = ReadVersion(version);
  return code == SQLITE_OK && version > kTableVersion ? kNewerTables : code;
}

int ConversionTable::Open() {
  int code = database_.Open({kIndexDatabase, {}, false, {}}, kBusyTimeout);
  if (code == SQLITE_OK) {
    code = database_.Prepare("PRAGMA user_version", version_);
  }
  if (code == SQLITE_OK) {
    code = database_.EnsureTables(
        {kTableVersion, kCreateTable, [this](int& version) { return ReadVersion(version); }});
  }
  if (code == SQLITE_OK) {
    code = database_.Prepare(kReplaceConversion, replace_);
  }
  return code;
}

/// The paths are not copied: both records must live until the statement has run.
int ConversionTable::BindConversion(const VELA_MEDIA_INFO& photo,
                                    const VELA_MEDIA_INFO& thumbnail) {
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
  return code == SQLITE_OK ? SQLITE_OK : SQLITE_ERROR;
}

/// The version is checked again: a newer program may have converted the table since it was opened.
int ConversionTable::StoreInTransaction() {
  int code = database_.Begin();
  if (code != SQLITE_OK) {
    return code;
  }
  code = CheckVersion();
  if (code == SQLITE_OK) {
    code = IndexDatabase::Run(replace_);
  }
  if (code == SQLITE_OK) {
    code = database_.Commit();
  }
  if (code != SQLITE_OK) {
    database_.RollBack();
  }
  return code;
}

int ConversionTable::Store(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail) {
  int code = BindConversion(photo, thumbnail);
  if (code == SQLITE_OK) {
    code = StoreInTransaction();
  }
  sqlite3_clear_bindings(replace_.get());
  return code;
}

/// Keeps the database open between the calls of a process: opening it costs several times as much
/// as a store. It is not closed at the end of the process, because the next program that opens the
/// database catches up on everything that closing would do.
class IndexRegister {
 public:
  /// Returns 0 or an errno value.
  int Store(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail);

 private:
  int EnsureOpen();

  std::mutex mutex_;
  std::unique_ptr<ConversionTable> table_;
};

int IndexRegister::EnsureOpen() {
  if (table_ && table_->Database().IsCurrent()) {
    return 0;
  }
  table_.reset();
  auto table = std::make_unique<ConversionTable>();
  const int error = ToErrno(table->Open());
  if (error == 0) {
    table_ = std::move(table);
  }
  return error;
}

int IndexRegister::Store(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail) {
  const std::lock_guard<std::mutex> lock(mutex_);
  if (table_ && !table_->Database().IsOwn()) {
    return ECHILD;
  }
  int error = EnsureOpen();
  if (error != 0) {
    return error;
  }
  error = ToErrno(table_->Store(photo, thumbnail));
  // The next call starts with a new connection, free of whatever caused the failure.
  if (error != 0) {
    table_.reset();
  }
  return error;
}

IndexRegister& ProcessRegister() {
  static auto* indexRegister = new IndexRegister;
  return *indexRegister;
}

}  // namespace

}  // namespace vela

int VELAIDX_IndexConvertAdd(const VELA_MEDIA_INFO& photo, const VELA_MEDIA_INFO& thumbnail,
                            const Json::Value& /*extra*/) {
  if (vela::PathOf(photo).empty() || vela::PathOf(thumbnail).empty()) {
    return vela::Fail(EINVAL);
  }
  const int error = vela::ProcessRegister().Store(photo, thumbnail);
  return error == 0 ? 0 : vela::Fail(error);
}

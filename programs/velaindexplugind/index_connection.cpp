#include "index_connection.h"

#include <utility>

namespace vela {

namespace {

/// How long opening waits for the transactions of other programs.
constexpr std::chrono::milliseconds kOpenTimeout(5000);

/// Version of the tables below. It is kept in a table, because user_version belongs to the programs
/// that register conversions in the same database.
constexpr int kTablesVersion = 1;

/// Paths are byte strings, sizes pixels and bytes, times seconds since the epoch. In `media`,
/// `read_at` is when the record was read; in `posted`, `kind` is 1 for photos and 2 for videos.
constexpr char kCreateTables[] =
    "CREATE TABLE IF NOT EXISTS velaindexplugind_schema ("
    " id INTEGER PRIMARY KEY CHECK (id = 1),"
    " version INTEGER NOT NULL"
    ");"
    "CREATE TABLE IF NOT EXISTS media ("
    " path BLOB NOT NULL PRIMARY KEY,"
    " type INTEGER NOT NULL,"
    " width INTEGER NOT NULL,"
    " height INTEGER NOT NULL,"
    " rotation INTEGER NOT NULL,"
    " duration INTEGER NOT NULL,"
    " bitrate INTEGER NOT NULL,"
    " size INTEGER NOT NULL,"
    " mtime INTEGER NOT NULL,"
    " mtime_nanoseconds INTEGER NOT NULL,"
    " read_at INTEGER NOT NULL"
    ") WITHOUT ROWID;"
    "CREATE TABLE IF NOT EXISTS posted ("
    " path BLOB NOT NULL,"
    " kind INTEGER NOT NULL,"
    " posted_at INTEGER NOT NULL,"
    " PRIMARY KEY (path, kind)"
    ") WITHOUT ROWID;"
    "CREATE TABLE IF NOT EXISTS directory_index_version ("
    " path BLOB NOT NULL PRIMARY KEY,"
    " version INTEGER NOT NULL"
    ") WITHOUT ROWID;"
    "INSERT OR REPLACE INTO velaindexplugind_schema VALUES (1, 1);";

/// Binds values to a statement and removes them at the end: texts are not copied.
class Bindings {
 public:
  explicit Bindings(sqlite3_stmt* statement) : statement_(statement) {}
  ~Bindings() {
    sqlite3_reset(statement_);
    sqlite3_clear_bindings(statement_);
  }
  Bindings(const Bindings&) = delete;
  Bindings& operator=(const Bindings&) = delete;

  Bindings& Add(std::string_view bytes) {
    Keep(sqlite3_bind_blob64(statement_, ++column_, bytes.data(), bytes.size(), SQLITE_STATIC));
    return *this;
  }
  Bindings& Add(int64_t number) {
    Keep(sqlite3_bind_int64(statement_, ++column_, number));
    return *this;
  }

  /// Runs the statement up to its next row. Returns SQLITE_ROW, SQLITE_DONE or an error.
  int Step() { return code_ == SQLITE_OK ? sqlite3_step(statement_) : code_; }

 private:
  void Keep(int code) {
    if (code_ == SQLITE_OK) {
      code_ = code;
    }
  }

  sqlite3_stmt* statement_;
  int column_ = 0;
  int code_ = SQLITE_OK;
};

/// Reads the columns of a row from left to right.
class Row {
 public:
  explicit Row(sqlite3_stmt* statement) : statement_(statement) {}
  int64_t Next() { return sqlite3_column_int64(statement_, column_++); }
  int32_t NextInt32() { return static_cast<int32_t>(Next()); }
  uint32_t NextUint32() { return static_cast<uint32_t>(Next()); }

 private:
  sqlite3_stmt* statement_;
  int column_ = 0;
};

StoredMedia ReadMedia(sqlite3_stmt* statement) {
  Row row(statement);
  StoredMedia media;
  media.record.type = row.NextInt32();
  media.record.width = row.NextUint32();
  media.record.height = row.NextUint32();
  media.record.rotation = row.NextInt32();
  media.record.duration = row.NextInt32();
  media.record.bitrate = row.NextUint32();
  media.record.file.size = row.Next();
  media.record.file.seconds = row.Next();
  media.record.file.nanoseconds = row.Next();
  media.readAt = row.Next();
  return media;
}

/// Returns SQLITE_OK for the step of a statement that ended or returned a row.
int EndOf(int stepCode) {
  return stepCode == SQLITE_DONE || stepCode == SQLITE_ROW ? SQLITE_OK : stepCode;
}

}  // namespace

bool IndexResult::IsUnusable() const {
  constexpr int kPrimaryCode = 0xff;
  if (code == kNewerTables) {
    return true;
  }
  switch (code & kPrimaryCode) {
    case SQLITE_NOTADB:
    case SQLITE_CORRUPT:
    case SQLITE_PERM:
    case SQLITE_READONLY:
      return true;
    default:
      return false;
  }
}

IndexResult IndexConnection::ResultOf(int code) const {
  if (code == SQLITE_OK) {
    return {};
  }
  if (code == kNewerTables) {
    return {code, "the tables in the index database are those of a newer velaindexplugind"};
  }
  return {code, database_.ErrorText(code)};
}

/// Sets 0 when the database does not have the tables.
int IndexConnection::ReadTablesVersion(int& version) {
  version = 0;
  Statement statement;
  int code = database_.Prepare(
      "SELECT count(*) FROM sqlite_master WHERE name = 'velaindexplugind_schema'", statement);
  if (code != SQLITE_OK) {
    return code;
  }
  code = sqlite3_step(statement.get());
  if (code != SQLITE_ROW || sqlite3_column_int(statement.get(), 0) == 0) {
    return EndOf(code);
  }
  code = database_.Prepare("SELECT version FROM velaindexplugind_schema", statement);
  if (code != SQLITE_OK) {
    return code;
  }
  code = sqlite3_step(statement.get());
  if (code == SQLITE_ROW) {
    version = sqlite3_column_int(statement.get(), 0);
  }
  return EndOf(code);
}

int IndexConnection::PrepareAll() {
  const std::pair<const char*, Statement&> statements[] = {
      {"SELECT type, width, height, rotation, duration, bitrate, size, mtime, mtime_nanoseconds,"
       " read_at FROM media WHERE path = ?1",
       findMedia_},
      {"INSERT OR REPLACE INTO media (path, type, width, height, rotation, duration, bitrate,"
       " size, mtime, mtime_nanoseconds, read_at)"
       " VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?10, ?11)",
       storeMedia_},
      {"DELETE FROM media WHERE path = ?1", removeMedia_},
      {"INSERT OR REPLACE INTO posted (path, kind, posted_at) VALUES (?1, ?2, ?3)", storePosted_},
      {"INSERT OR REPLACE INTO directory_index_version (path, version) VALUES (?1, ?2)",
       storeVersion_},
      {"DELETE FROM directory_index_version WHERE path = ?1", removeVersion_},
      {"SELECT version FROM directory_index_version WHERE path = ?1", findVersion_}};
  for (const auto& [sql, statement] : statements) {
    const int code = database_.Prepare(sql, statement);
    if (code != SQLITE_OK) {
      return code;
    }
  }
  return SQLITE_OK;
}

IndexResult IndexConnection::Open(const IndexFile& file) {
  int code = database_.Open(file, kOpenTimeout);
  if (code == SQLITE_OK) {
    code = database_.EnsureTables({kTablesVersion, kCreateTables,
                                   [this](int& version) { return ReadTablesVersion(version); }});
  }
  if (code == SQLITE_OK) {
    code = PrepareAll();
  }
  return ResultOf(code);
}

IndexResult IndexConnection::TransactOnce(const std::function<IndexResult()>& change) {
  const int begun = database_.Begin();
  if (begun != SQLITE_OK) {
    return ResultOf(begun);
  }
  IndexResult result = change();
  if (result.IsOk()) {
    result = ResultOf(database_.Commit());
  }
  if (!result.IsOk()) {
    database_.RollBack();
  }
  return result;
}

IndexResult IndexConnection::Transact(bool isDurable, const std::function<IndexResult()>& change) {
  if (!isDurable) {
    return TransactOnce(change);
  }
  const int code = database_.Execute("PRAGMA synchronous = FULL");
  if (code != SQLITE_OK) {
    return ResultOf(code);
  }
  IndexResult result = TransactOnce(change);
  database_.Execute("PRAGMA synchronous = NORMAL");
  return result;
}

IndexResult IndexConnection::FindMedia(std::string_view path, std::optional<StoredMedia>& media) {
  media.reset();
  Bindings bindings(findMedia_.get());
  const int code = bindings.Add(path).Step();
  if (code == SQLITE_ROW) {
    media = ReadMedia(findMedia_.get());
  }
  return ResultOf(EndOf(code));
}

IndexResult IndexConnection::StoreMedia(std::string_view path, const StoredMedia& media) {
  const MediaRecord& record = media.record;
  Bindings bindings(storeMedia_.get());
  bindings.Add(path).Add(record.type).Add(record.width).Add(record.height).Add(record.rotation);
  bindings.Add(record.duration).Add(record.bitrate).Add(record.file.size);
  bindings.Add(record.file.seconds).Add(record.file.nanoseconds).Add(media.readAt);
  return ResultOf(EndOf(bindings.Step()));
}

IndexResult IndexConnection::RemoveMedia(std::string_view path) {
  Bindings bindings(removeMedia_.get());
  return ResultOf(EndOf(bindings.Add(path).Step()));
}

IndexResult IndexConnection::StorePosted(std::string_view path, int kind, int64_t postedAt) {
  Bindings bindings(storePosted_.get());
  return ResultOf(EndOf(bindings.Add(path).Add(kind).Add(postedAt).Step()));
}

IndexResult IndexConnection::StoreVersion(std::string_view directory,
                                          std::optional<int32_t> version) {
  Bindings bindings((version ? storeVersion_ : removeVersion_).get());
  bindings.Add(directory);
  if (version) {
    bindings.Add(*version);
  }
  return ResultOf(EndOf(bindings.Step()));
}

IndexResult IndexConnection::FindVersion(std::string_view directory,
                                         std::optional<int32_t>& version) {
  version.reset();
  Bindings bindings(findVersion_.get());
  const int code = bindings.Add(directory).Step();
  if (code == SQLITE_ROW) {
    version = sqlite3_column_int(findVersion_.get(), 0);
  }
  return ResultOf(EndOf(code));
}

}  // namespace vela

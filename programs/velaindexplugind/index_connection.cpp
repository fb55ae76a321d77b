#include "index_connection.h"

#include <thread>

#include "index_tables.h"

namespace vela {

namespace {

/// How long the opening waits for another program's transaction.
constexpr std::chrono::milliseconds kOpenPatience(5000);

/// Not among the codes that the library gives.
constexpr int kNewerTables = -1;

/// Gives a statement its values, and takes them back at the end: texts are not copied.
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
    Note(sqlite3_bind_blob64(statement_, ++column_, bytes.data(), bytes.size(), SQLITE_STATIC));
    return *this;
  }
  Bindings& Add(int64_t number) {
    Note(sqlite3_bind_int64(statement_, ++column_, number));
    return *this;
  }

  /// Runs the statement up to its next row. Returns SQLITE_ROW, SQLITE_DONE or an error.
  int Step() { return code_ == SQLITE_OK ? sqlite3_step(statement_) : code_; }

 private:
  void Note(int code) {
    if (code_ == SQLITE_OK) code_ = code;
  }

  sqlite3_stmt* statement_;
  int column_ = 0;
  int code_ = SQLITE_OK;
};

/// Reads the columns of a row in their order.
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

/// SQLITE_OK for a statement that came to its end or gave a row.
int EndOf(int stepCode) {
  return stepCode == SQLITE_DONE || stepCode == SQLITE_ROW ? SQLITE_OK : stepCode;
}

}  // namespace

IndexResult IndexConnection::Tell(int code) const {
  if (code == SQLITE_OK) return {};
  if (code == kNewerTables) {
    return {code, "the tables in the index database are those of a newer velaindexplugind"};
  }
  const bool isOwn = database_ != nullptr && sqlite3_extended_errcode(database_.get()) == code;
  return {code, isOwn ? sqlite3_errmsg(database_.get()) : sqlite3_errstr(code)};
}

int IndexConnection::Execute(const char* sql) {
  return sqlite3_exec(database_.get(), sql, nullptr, nullptr, nullptr);
}

/// The library does not wait for other programs in all statements; this does.
int IndexConnection::ExecuteOnceFree(const char* sql) {
  constexpr std::chrono::milliseconds kPause(5);
  const auto end = std::chrono::steady_clock::now() + kOpenPatience;
  int code = Execute(sql);
  while (IndexResult{code, {}}.IsBusy() && std::chrono::steady_clock::now() < end) {
    std::this_thread::sleep_for(kPause);
    code = Execute(sql);
  }
  return code;
}

int IndexConnection::Prepare(const char* sql, Statement& statement) {
  sqlite3_stmt* prepared = nullptr;
  const int code =
      sqlite3_prepare_v3(database_.get(), sql, -1, SQLITE_PREPARE_PERSISTENT, &prepared, nullptr);
  statement.reset(prepared);
  return code;
}

int IndexConnection::OpenFile(const std::string& file) {
  constexpr int kFlags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX;
  sqlite3* database = nullptr;
  const int code = sqlite3_open_v2(file.c_str(), &database, kFlags, nullptr);
  database_.reset(database);
  return code;
}

int IndexConnection::Configure() {
  sqlite3_extended_result_codes(database_.get(), 1);
  SetPatience(kOpenPatience);
  // A checkpoint at the close would remove the log by its name, even if that belongs to a new
  // database by then.
  sqlite3_db_config(database_.get(), SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
  const int code = ExecuteOnceFree("PRAGMA journal_mode = WAL");
  return code == SQLITE_OK ? Execute("PRAGMA synchronous = NORMAL") : code;
}

/// Version 0: there are no tables.
int IndexConnection::ReadTablesVersion(int& version) {
  version = 0;
  Statement statement;
  int code = Prepare("SELECT count(*) FROM sqlite_master WHERE name = 'velaindexplugind_schema'",
                     statement);
  if (code != SQLITE_OK) return code;
  code = sqlite3_step(statement.get());
  if (code != SQLITE_ROW || sqlite3_column_int(statement.get(), 0) == 0) return EndOf(code);
  code = Prepare("SELECT version FROM velaindexplugind_schema", statement);
  if (code != SQLITE_OK) return code;
  code = sqlite3_step(statement.get());
  if (code == SQLITE_ROW) version = sqlite3_column_int(statement.get(), 0);
  return EndOf(code);
}

int IndexConnection::MakeTables() {
  int code = ExecuteOnceFree("BEGIN IMMEDIATE");
  if (code != SQLITE_OK) return code;
  // Another process may have made them meanwhile, a newer one too.
  int version = 0;
  code = ReadTablesVersion(version);
  if (code == SQLITE_OK && version > kTablesVersion) code = kNewerTables;
  if (code == SQLITE_OK) code = Execute(kMakeTables);
  if (code == SQLITE_OK) code = Execute("COMMIT");
  if (code != SQLITE_OK) Execute("ROLLBACK");
  return code;
}

int IndexConnection::EnsureTables() {
  int version = 0;
  const int code = ReadTablesVersion(version);
  if (code != SQLITE_OK) return code;
  if (version > kTablesVersion) return kNewerTables;
  return version == kTablesVersion ? SQLITE_OK : MakeTables();
}

int IndexConnection::PrepareAll() {
  int code = Prepare(
      "SELECT type, width, height, rotation, duration, bitrate, size, mtime, mtime_nanoseconds,"
      " read_at FROM media WHERE path = ?1",
      findMedia_);
  if (code == SQLITE_OK) {
    code = Prepare(
        "INSERT OR REPLACE INTO media (path, type, width, height, rotation, duration, bitrate,"
        " size, mtime, mtime_nanoseconds, read_at)"
        " VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?10, ?11)",
        storeMedia_);
  }
  if (code == SQLITE_OK) code = Prepare("DELETE FROM media WHERE path = ?1", removeMedia_);
  if (code == SQLITE_OK) {
    code = Prepare("INSERT OR REPLACE INTO posted (path, kind, posted_at) VALUES (?1, ?2, ?3)",
                   storePosted_);
  }
  if (code == SQLITE_OK) {
    code = Prepare("INSERT OR REPLACE INTO directory_index_version (path, version) VALUES (?1, ?2)",
                   storeVersion_);
  }
  if (code == SQLITE_OK) {
    code = Prepare("DELETE FROM directory_index_version WHERE path = ?1", removeVersion_);
  }
  if (code == SQLITE_OK) {
    code = Prepare("SELECT version FROM directory_index_version WHERE path = ?1", findVersion_);
  }
  return code;
}

IndexResult IndexConnection::Open(const IndexFile& file) {
  // The library would make it with a mode that depends on the process's mask.
  MakeIndexFile(file);
  int code = OpenFile(file.path);
  if (code == SQLITE_OK) code = Configure();
  if (code == SQLITE_OK) code = EnsureTables();
  if (code == SQLITE_OK) code = PrepareAll();
  return Tell(code);
}

bool IndexConnection::IsCurrent() const {
  int hasMoved = 1;
  const int code = sqlite3_file_control(database_.get(), "main", SQLITE_FCNTL_HAS_MOVED, &hasMoved);
  return code == SQLITE_OK && hasMoved == 0;
}

void IndexConnection::SetPatience(std::chrono::milliseconds patience) {
  sqlite3_busy_timeout(database_.get(), static_cast<int>(patience.count()));
}

IndexResult IndexConnection::TransactOnce(const std::function<IndexResult()>& change) {
  const int begun = Execute("BEGIN IMMEDIATE");
  if (begun != SQLITE_OK) return Tell(begun);
  IndexResult result = change();
  if (result.IsOk()) result = Tell(Execute("COMMIT"));
  if (!result.IsOk()) Execute("ROLLBACK");
  return result;
}

IndexResult IndexConnection::Transact(bool isDurable, const std::function<IndexResult()>& change) {
  if (!isDurable) return TransactOnce(change);
  const int code = Execute("PRAGMA synchronous = FULL");
  if (code != SQLITE_OK) return Tell(code);
  IndexResult result = TransactOnce(change);
  Execute("PRAGMA synchronous = NORMAL");
  return result;
}

IndexResult IndexConnection::FindMedia(std::string_view path, std::optional<StoredMedia>& media) {
  media.reset();
  Bindings bindings(findMedia_.get());
  const int code = bindings.Add(path).Step();
  if (code == SQLITE_ROW) media = ReadMedia(findMedia_.get());
  return Tell(EndOf(code));
}

IndexResult IndexConnection::StoreMedia(std::string_view path, const StoredMedia& media) {
  const MediaRecord& record = media.record;
  Bindings bindings(storeMedia_.get());
  bindings.Add(path).Add(record.type).Add(record.width).Add(record.height).Add(record.rotation);
  bindings.Add(record.duration).Add(record.bitrate).Add(record.file.size);
  bindings.Add(record.file.seconds).Add(record.file.nanoseconds).Add(media.readAt);
  return Tell(EndOf(bindings.Step()));
}

IndexResult IndexConnection::RemoveMedia(std::string_view path) {
  Bindings bindings(removeMedia_.get());
  return Tell(EndOf(bindings.Add(path).Step()));
}

IndexResult IndexConnection::StorePosted(std::string_view path, int kind, int64_t postedAt) {
  Bindings bindings(storePosted_.get());
  return Tell(EndOf(bindings.Add(path).Add(kind).Add(postedAt).Step()));
}

IndexResult IndexConnection::StoreVersion(std::string_view directory,
                                          std::optional<int32_t> version) {
  Bindings bindings((version ? storeVersion_ : removeVersion_).get());
  bindings.Add(directory);
  if (version) bindings.Add(*version);
  return Tell(EndOf(bindings.Step()));
}

IndexResult IndexConnection::FindVersion(std::string_view directory,
                                         std::optional<int32_t>& version) {
  version.reset();
  Bindings bindings(findVersion_.get());
  const int code = bindings.Add(directory).Step();
  if (code == SQLITE_ROW) version = sqlite3_column_int(findVersion_.get(), 0);
  return Tell(EndOf(code));
}

}  // namespace vela

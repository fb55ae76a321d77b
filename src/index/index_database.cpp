#include "index/index_database.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <system_error>
#include <thread>

#include "posix/file_descriptor.h"

namespace vela {

namespace {

/// The index contains the names of all users' photos, also of those in private directories.
constexpr mode_t kDirectoryMode = 0750;
constexpr mode_t kFileMode = 0640;

constexpr uid_t kSameOwner = static_cast<uid_t>(-1);

bool IsBusy(int code) {
  constexpr int kPrimaryCode = 0xff;
  return (code & kPrimaryCode) == SQLITE_BUSY;
}

void SetGroup(int fd, const std::string& path, const IndexFile& file) {
  if (!file.group || fchown(fd, kSameOwner, *file.group) == 0) {
    return;
  }
  const int error = errno;
  if (file.onGroupFailure) {
    file.onGroupFailure(path, *file.group, error);
  }
}

FileDescriptor CreateNew(const std::string& path) {
  return FileDescriptor(open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, kFileMode));
}

/// SQLite would create the file with a mode that depends on the umask. A failure surfaces when the
/// file is opened.
void CreateFileIfMissing(const IndexFile& file) {
  FileDescriptor created = CreateNew(file.path);
  if (!created.IsOpen() && errno == ENOENT) {
    CreateIndexDirectory(file);
    created = CreateNew(file.path);
  }
  if (!created.IsOpen()) {
    return;
  }
  SetGroup(created.Get(), file.path, file);
  fchmod(created.Get(), kFileMode);
}

}  // namespace

void CreateIndexDirectory(const IndexFile& file) {
  const std::filesystem::path directory = std::filesystem::path(file.path).parent_path();
  if (directory.empty()) {
    return;
  }
  if (file.createsParents) {
    std::error_code ignored;
    std::filesystem::create_directories(directory.parent_path(), ignored);
  }
  if (mkdir(directory.c_str(), kDirectoryMode) != 0) {
    return;
  }
  const int flags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
  const FileDescriptor created(open(directory.c_str(), flags));
  if (!created.IsOpen()) {
    return;
  }
  SetGroup(created.Get(), directory, file);
  fchmod(created.Get(), kDirectoryMode);
}

int IndexDatabase::Execute(const char* sql) {
  return sqlite3_exec(database_.get(), sql, nullptr, nullptr, nullptr);
}

int IndexDatabase::Prepare(const char* sql, Statement& statement) {
  sqlite3_stmt* prepared = nullptr;
  const int code =
      sqlite3_prepare_v3(database_.get(), sql, -1, SQLITE_PREPARE_PERSISTENT, &prepared, nullptr);
  statement.reset(prepared);
  return code;
}

int IndexDatabase::Run(const Statement& statement) {
  sqlite3_step(statement.get());
  return sqlite3_reset(statement.get());
}

/// Some statements fail at once when another connection holds the database, whatever the busy
/// timeout; this repeats them.
int IndexDatabase::ExecuteWhenFree(const char* sql) {
  constexpr std::chrono::milliseconds kPause(5);
  const auto end = std::chrono::steady_clock::now() + openTimeout_;
  int code = Execute(sql);
  while (IsBusy(code) && std::chrono::steady_clock::now() < end) {
    std::this_thread::sleep_for(kPause);
    code = Execute(sql);
  }
  return code;
}

int IndexDatabase::OpenFile(const std::string& path) {
  constexpr int kFlags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX;
  sqlite3* database = nullptr;
  const int code = sqlite3_open_v2(path.c_str(), &database, kFlags, nullptr);
  database_.reset(database);
  return code;
}

int IndexDatabase::Configure() {
  sqlite3_extended_result_codes(database_.get(), 1);
  SetBusyTimeout(openTimeout_);
  // A checkpoint on close would wait for the disk, and would remove the log by its name, even when
  // that belongs to a new database by then.
  sqlite3_db_config(database_.get(), SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
  int code = ExecuteWhenFree("PRAGMA journal_mode = WAL");
  if (code == SQLITE_OK) {
    code = Execute("PRAGMA synchronous = NORMAL");
  }
  if (code == SQLITE_OK) {
    code = Prepare("BEGIN IMMEDIATE", begin_);
  }
  if (code == SQLITE_OK) {
    code = Prepare("COMMIT", commit_);
  }
  return code;
}

int IndexDatabase::Open(const IndexFile& file, std::chrono::milliseconds timeout) {
  process_ = getpid();
  openTimeout_ = timeout;
  CreateFileIfMissing(file);
  const int code = OpenFile(file.path);
  return code == SQLITE_OK ? Configure() : code;
}

int IndexDatabase::CreateTables(const IndexTables& tables) {
  int code = ExecuteWhenFree("BEGIN IMMEDIATE");
  if (code != SQLITE_OK) {
    return code;
  }
  // Another process, possibly a newer program, may have created them since the first check.
  int version = 0;
  code = tables.readVersion(version);
  if (code == SQLITE_OK && version > tables.version) {
    code = kNewerTables;
  }
  if (code == SQLITE_OK && version < tables.version) {
    code = Execute(tables.creation);
  }
  if (code == SQLITE_OK) {
    code = Commit();
  }
  if (code != SQLITE_OK) {
    RollBack();
  }
  return code;
}

int IndexDatabase::EnsureTables(const IndexTables& tables) {
  int version = 0;
  const int code = tables.readVersion(version);
  if (code != SQLITE_OK) {
    return code;
  }
  if (version > tables.version) {
    return kNewerTables;
  }
  return version == tables.version ? SQLITE_OK : CreateTables(tables);
}

void IndexDatabase::SetBusyTimeout(std::chrono::milliseconds timeout) {
  sqlite3_busy_timeout(database_.get(), static_cast<int>(timeout.count()));
}

bool IndexDatabase::IsCurrent() const {
  int hasMoved = 1;
  const int code = sqlite3_file_control(database_.get(), "main", SQLITE_FCNTL_HAS_MOVED, &hasMoved);
  return code == SQLITE_OK && hasMoved == 0;
}

bool IndexDatabase::IsOwn() const {
  return process_ == getpid();
}

const char* IndexDatabase::ErrorText(int code) const {
  const bool isLast = database_ != nullptr && sqlite3_extended_errcode(database_.get()) == code;
  return isLast ? sqlite3_errmsg(database_.get()) : sqlite3_errstr(code);
}

}  // namespace vela

// The embedded index database, opened in the same way by all programs that share it.
#pragma once

#include <sqlite3.h>

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "posix/accounts.h"

namespace vela {

inline constexpr char kIndexDatabase[] = "/var/lib/velaindex/index.db";

/// Where the database is, and how it is created when it is missing.
struct IndexFile {
  std::string path;
  std::optional<gid_t> group;   ///< of created files; not set: the system's default
  bool createsParents = false;  ///< also creates missing parent directories
  /// Called with the path, the group and the errno value when the group of a created file or
  /// directory cannot be set.
  std::function<void(const std::string& path, gid_t group, int error)> onGroupFailure = nullptr;
};

/// Creates the directory of the database when it is missing, accessible to its owner and group
/// only, whatever the umask. A failure surfaces when the database is opened.
void CreateIndexDirectory(const IndexFile& file);

/// The tables of one program. The programs count their versions independently.
struct IndexTables {
  int version;           ///< 0 is a database without the tables
  const char* creation;  ///< SQL that creates the tables and stores their version
  /// Reads the version of the tables. Returns an SQLite result code.
  std::function<int(int& version)> readVersion;
};

/// Not an SQLite result code: a newer program has created the tables.
inline constexpr int kNewerTables = -1;

/// A connection to the database, for one thread at a time. Functions that return an int return an
/// extended SQLite result code.
class IndexDatabase {
 public:
  struct Finalize {
    void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
  };
  using Statement = std::unique_ptr<sqlite3_stmt, Finalize>;

  /// Opens the file in WAL mode. Creates it and its directory when missing, accessible to their
  /// owner and group only, whatever the umask; existing ones keep their modes. This and all later
  /// operations wait up to `timeout` for the transactions of other connections.
  int Open(const IndexFile& file, std::chrono::milliseconds timeout);

  /// Creates the tables unless they exist. Returns kNewerTables, and changes nothing, when their
  /// version is higher than this program's.
  int EnsureTables(const IndexTables& tables);

  /// Sets how long the operations that follow wait for the transactions of other connections.
  void SetBusyTimeout(std::chrono::milliseconds timeout);

  /// Returns whether the open file is still the one at its path.
  bool IsCurrent() const;

  /// Returns whether this process opened the database, which must not be used across a fork.
  bool IsOwn() const;

  int Begin() { return Run(begin_); }
  int Commit() { return Run(commit_); }
  void RollBack() { Execute("ROLLBACK"); }

  int Execute(const char* sql);
  int Prepare(const char* sql, Statement& statement);

  /// Runs a statement to its end, ignoring its rows.
  static int Run(const Statement& statement);

  /// Describes `code`, the result of the last operation.
  const char* ErrorText(int code) const;

 private:
  struct Close {
    void operator()(sqlite3* database) const { sqlite3_close_v2(database); }
  };

  int OpenFile(const std::string& path);
  int Configure();
  int ExecuteWhenFree(const char* sql);
  int CreateTables(const IndexTables& tables);

  std::unique_ptr<sqlite3, Close> database_;
  Statement begin_;
  Statement commit_;
  std::chrono::milliseconds openTimeout_{0};
  pid_t process_ = -1;
};

}  // namespace vela

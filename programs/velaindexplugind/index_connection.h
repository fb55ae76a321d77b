// One connection to the index database, used by one thread at a time.
#pragma once

#include <sqlite3.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "index_file.h"
#include "media_record.h"

namespace vela {

/// How an operation on the index ended: an SQLite result code and what to tell about it.
struct IndexResult {
  int code = SQLITE_OK;
  std::string message;  ///< empty when all went well

  bool IsOk() const { return code == SQLITE_OK; }

  /// Whether another writer kept the operation from its turn.
  bool IsBusy() const {
    constexpr int kPrimaryCode = 0xff;
    return (code & kPrimaryCode) == SQLITE_BUSY;
  }
};

/// A record with the time it was read at.
struct StoredMedia {
  MediaRecord record;
  int64_t readAt = 0;  ///< seconds since the epoch
};

/// An open index database.
class IndexConnection {
 public:
  /// Opens the database; makes it and its directory when missing, and the daemon's tables. Tables
  /// of a newer version are an error.
  IndexResult Open(const IndexFile& file);

  /// Returns whether the open file is still the one at its path.
  bool IsCurrent() const;

  /// How long the operations that follow wait for another program's transaction.
  void SetPatience(std::chrono::milliseconds patience);

  /// Carries out the operations of `change` in one transaction: all that they store is stored, or
  /// nothing when one of them fails. With `isDurable` it is on the disk when this returns.
  IndexResult Transact(bool isDurable, const std::function<IndexResult()>& change);

  IndexResult FindMedia(std::string_view path, std::optional<StoredMedia>& media);
  IndexResult StoreMedia(std::string_view path, const StoredMedia& media);
  IndexResult RemoveMedia(std::string_view path);

  /// Stores that the conversion of `path` is over, in place of an earlier time. `kind` is 1 photo,
  /// 2 video.
  IndexResult StorePosted(std::string_view path, int kind, int64_t postedAt);

  /// Stores the version that is set for the directory itself; no version removes it.
  IndexResult StoreVersion(std::string_view directory, std::optional<int32_t> version);

  /// Finds the version set for the directory itself.
  IndexResult FindVersion(std::string_view directory, std::optional<int32_t>& version);

 private:
  struct Close {
    void operator()(sqlite3* database) const { sqlite3_close_v2(database); }
  };
  struct Finalize {
    void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
  };
  using Statement = std::unique_ptr<sqlite3_stmt, Finalize>;

  int OpenFile(const std::string& file);
  int Configure();
  int EnsureTables();
  int MakeTables();
  int ReadTablesVersion(int& version);
  int PrepareAll();
  int Prepare(const char* sql, Statement& statement);
  int Execute(const char* sql);
  int ExecuteOnceFree(const char* sql);
  IndexResult TransactOnce(const std::function<IndexResult()>& change);
  IndexResult Tell(int code) const;

  std::unique_ptr<sqlite3, Close> database_;
  Statement findMedia_;
  Statement storeMedia_;
  Statement removeMedia_;
  Statement storePosted_;
  Statement storeVersion_;
  Statement removeVersion_;
  Statement findVersion_;
};

}  // namespace vela

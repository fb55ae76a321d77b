// One connection to the index database, used by one thread at a time.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "index/index_database.h"
#include "media_record.h"

namespace vela {

/// The result of an operation on the index.
struct IndexResult {
  int code = SQLITE_OK;  ///< an SQLite result code, or kNewerTables
  std::string message;   ///< the error in words; empty on success

  bool IsOk() const { return code == SQLITE_OK; }

  /// Returns whether the operation fails again until an administrator changes or removes the
  /// database.
  bool IsUnusable() const;

  /// Returns whether the operation failed because other writers held the database.
  bool IsBusy() const {
    constexpr int kPrimaryCode = 0xff;
    return (code & kPrimaryCode) == SQLITE_BUSY;
  }
};

/// A record with the time when it was read.
struct StoredMedia {
  MediaRecord record;
  int64_t readAt = 0;  ///< seconds since the epoch
};

/// The daemon's tables in an open index database.
class IndexConnection {
 public:
  /// Opens the database; creates it, its directory and the daemon's tables when missing. Tables of
  /// a newer version are an error.
  IndexResult Open(const IndexFile& file);

  /// Returns whether the open file is still the one at its path.
  bool IsCurrent() const { return database_.IsCurrent(); }

  /// Sets how long the operations that follow wait for the transactions of other programs.
  void SetBusyTimeout(std::chrono::milliseconds timeout) { database_.SetBusyTimeout(timeout); }

  /// Runs the operations of `change` in one transaction, which is rolled back when one of them
  /// fails. With `isDurable`, the changes are on the disk when this returns.
  IndexResult Transact(bool isDurable, const std::function<IndexResult()>& change);

  IndexResult FindMedia(std::string_view path, std::optional<StoredMedia>& media);
  IndexResult StoreMedia(std::string_view path, const StoredMedia& media);
  IndexResult RemoveMedia(std::string_view path);

  /// Stores when the conversion of `path` was finished, replacing an earlier time. `kind` is 1 for
  /// a photo, 2 for a video.
  IndexResult StorePosted(std::string_view path, int kind, int64_t postedAt);

  /// Stores the version set for the directory itself; without a version, removes it.
  IndexResult StoreVersion(std::string_view directory, std::optional<int32_t> version);

  /// Finds the version set for the directory itself.
  IndexResult FindVersion(std::string_view directory, std::optional<int32_t>& version);

 private:
  using Statement = IndexDatabase::Statement;

  int ReadTablesVersion(int& version);
  int PrepareAll();
  IndexResult TransactOnce(const std::function<IndexResult()>& change);
  IndexResult ResultOf(int code) const;

  IndexDatabase database_;
  Statement findMedia_;
  Statement storeMedia_;
  Statement removeMedia_;
  Statement storePosted_;
  Statement storeVersion_;
  Statement removeVersion_;
  Statement findVersion_;
};

}  // namespace vela

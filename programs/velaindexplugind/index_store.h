// The index database for all threads of the daemon.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "index_connection.h"

namespace vela {

/// Returns the absolute `path` without ".", "..", repeated slashes and a slash at the end. Symbolic
/// links are not resolved.
std::string PlainPath(std::string_view path);

/// Returns the directory above the plain path `path`, "" above "/". The result points into
/// `path` or to a constant.
std::string_view ParentOf(std::string_view path);

/// The index. All operations may be called from any thread; each uses its own connection, so that
/// readers do not wait for writers. A database that was removed or replaced is reopened by
/// the next operation, as is one that returned an error.
class IndexStore {
 public:
  using Clock = std::chrono::steady_clock;
  using Operation = std::function<IndexResult(IndexConnection&)>;

  explicit IndexStore(IndexFile file) : file_(std::move(file)) {}

  /// Opens the database for the first time.
  IndexResult Open();

  IndexResult FindMedia(std::string_view path, std::optional<StoredMedia>& media);

  /// Stores a record. Gives up soon when other writers hold the database: the record can be read
  /// from its file again.
  IndexResult StoreMedia(std::string_view path, const StoredMedia& media);

  /// Removes the record of `path`, if there is one.
  IndexResult RemoveMedia(std::string_view path);

  /// Runs `change` in one transaction, which starts when the database is free of other writers, in
  /// this program and in others. The result is busy when that does not happen before `end`. With
  /// `isDurable`, the changes are on the disk when this returns.
  IndexResult Change(Clock::time_point end, bool isDurable, const Operation& change);

  /// Finds the version set for the plain path itself or the nearest directory above it.
  IndexResult FindNearestVersion(std::string_view path, std::optional<int32_t>& version);

 private:
  IndexResult Read(const Operation& operation);
  IndexResult Write(Clock::time_point end, const Operation& operation);
  std::unique_ptr<IndexConnection> TakeIdle();
  IndexResult Acquire(std::unique_ptr<IndexConnection>& connection);
  void Release(std::unique_ptr<IndexConnection> connection);

  const IndexFile file_;
  std::mutex idleMutex_;
  std::vector<std::unique_ptr<IndexConnection>> idle_;
  /// SQLite makes waiting writers poll; with this lock, those of this program need not.
  std::timed_mutex writeMutex_;
};

}  // namespace vela

// The index database for all threads of the daemon.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string_view>
#include <vector>

#include "index_connection.h"
#include "index_file.h"

namespace vela {

/// The index. All operations may be called from any thread; each works with a connection of its
/// own, so that a reader does not wait for a writer. A database that is removed or replaced is
/// opened anew at the next operation, as is one that gave an error.
class IndexStore {
 public:
  using Clock = std::chrono::steady_clock;
  using Operation = std::function<IndexResult(IndexConnection&)>;

  explicit IndexStore(IndexFile file) : file_(std::move(file)) {}

  /// Opens the database for the first time.
  IndexResult Open();

  IndexResult FindMedia(std::string_view path, std::optional<StoredMedia>& media);

  /// Stores a record, unless it would have to wait for long: it can be read again.
  IndexResult StoreMedia(std::string_view path, const StoredMedia& media);

  /// Removes the record of `path`, when there is one.
  IndexResult RemoveMedia(std::string_view path);

  /// Carries out `change` in one transaction, which begins as soon as no other one is there, in
  /// this program and in others; busy when that is not before `end`. With `isDurable` all is on the
  /// disk when this returns.
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
  /// The library lets one writer in and has the others sleep; these need not.
  std::timed_mutex writeMutex_;
};

}  // namespace vela

#include "index_store.h"

#include <utility>

#include "index_path.h"

namespace {

/// How long an operation waits for other writers, in this program and in others.
constexpr std::chrono::milliseconds kPatience(5000);
constexpr std::chrono::milliseconds kShortPatience(250);

}  // namespace

std::unique_ptr<IndexConnection> IndexStore::TakeIdle() {
  const std::lock_guard<std::mutex> lock(idleMutex_);
  if (idle_.empty()) return nullptr;
  std::unique_ptr<IndexConnection> connection = std::move(idle_.back());
  idle_.pop_back();
  return connection;
}

IndexResult IndexStore::Acquire(std::unique_ptr<IndexConnection>& connection) {
  connection = TakeIdle();
  while (connection && !connection->IsCurrent()) connection = TakeIdle();
  if (connection) return {};
  connection = std::make_unique<IndexConnection>();
  return connection->Open(file_);
}

void IndexStore::Release(std::unique_ptr<IndexConnection> connection) {
  const std::lock_guard<std::mutex> lock(idleMutex_);
  idle_.push_back(std::move(connection));
}

IndexResult IndexStore::Read(const Operation& operation) {
  std::unique_ptr<IndexConnection> connection;
  IndexResult result = Acquire(connection);
  if (result.IsOk()) result = operation(*connection);
  // Whatever was wrong, the next operation shall not inherit it.
  if (result.IsOk()) Release(std::move(connection));
  return result;
}

IndexResult IndexStore::Write(std::chrono::milliseconds patience, const Operation& operation) {
  const std::unique_lock<std::timed_mutex> lock(writeMutex_, patience);
  if (!lock.owns_lock()) return {SQLITE_BUSY, sqlite3_errstr(SQLITE_BUSY)};
  return Read([&](IndexConnection& connection) {
    connection.SetPatience(patience);
    return operation(connection);
  });
}

IndexResult IndexStore::Open() {
  return Read([](IndexConnection&) { return IndexResult(); });
}

IndexResult IndexStore::FindMedia(std::string_view path, std::optional<StoredMedia>& media) {
  return Read([&](IndexConnection& connection) { return connection.FindMedia(path, media); });
}

IndexResult IndexStore::StoreMedia(std::string_view path, const StoredMedia& media) {
  return Write(kShortPatience,
               [&](IndexConnection& connection) { return connection.StoreMedia(path, media); });
}

IndexResult IndexStore::RemoveMedia(std::string_view path) {
  std::optional<StoredMedia> media;
  IndexResult result = FindMedia(path, media);
  if (!result.IsOk() || !media) return result;
  return Write(kShortPatience,
               [&](IndexConnection& connection) { return connection.RemoveMedia(path); });
}

IndexResult IndexStore::StorePosted(std::string_view path, int kind, int64_t postedAt) {
  return Write(kPatience, [&](IndexConnection& connection) {
    return connection.StorePosted(path, kind, postedAt);
  });
}

IndexResult IndexStore::StoreVersion(std::string_view directory, std::optional<int32_t> version) {
  return Write(kPatience, [&](IndexConnection& connection) {
    return connection.StoreVersion(directory, version);
  });
}

IndexResult IndexStore::FindNearestVersion(std::string_view path, std::optional<int32_t>& version) {
  return Read([&](IndexConnection& connection) {
    IndexResult result;
    for (std::string_view at = path; result.IsOk() && !at.empty(); at = ParentOf(at)) {
      result = connection.FindVersion(at, version);
      if (version) break;
    }
    return result;
  });
}

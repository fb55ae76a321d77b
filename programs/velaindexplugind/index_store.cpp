#include "index_store.h"

#include <algorithm>
#include <filesystem>
#include <utility>

namespace vela {

namespace {

/// How long writing a record, which can be read from its file again, waits for other writers.
constexpr std::chrono::milliseconds kRecordTimeout(250);

/// Returns the time left until `end`, 0 when it has passed.
std::chrono::milliseconds LeftUntil(IndexStore::Clock::time_point end) {
  const auto left = end - IndexStore::Clock::now();
  return std::max(std::chrono::duration_cast<std::chrono::milliseconds>(left),
                  std::chrono::milliseconds(0));
}

}  // namespace

std::string PlainPath(std::string_view path) {
  std::string plain = std::filesystem::path(path).lexically_normal().native();
  // Two leading slashes may have a meaning of their own on other systems, and are kept above.
  const size_t first = plain.find_first_not_of('/');
  if (first == std::string::npos) {
    return "/";
  }
  plain.erase(0, first - 1);
  if (plain.back() == '/') {
    plain.pop_back();
  }
  return plain;
}

std::string_view ParentOf(std::string_view path) {
  if (path.size() <= 1) {
    return {};
  }
  const size_t slash = path.rfind('/');
  return slash == 0 ? std::string_view("/") : path.substr(0, slash);
}

std::unique_ptr<IndexConnection> IndexStore::TakeIdle() {
  const std::lock_guard<std::mutex> lock(idleMutex_);
  if (idle_.empty()) {
    return nullptr;
  }
  std::unique_ptr<IndexConnection> connection = std::move(idle_.back());
  idle_.pop_back();
  return connection;
}

IndexResult IndexStore::Acquire(std::unique_ptr<IndexConnection>& connection) {
  connection = TakeIdle();
  while (connection && !connection->IsCurrent()) {
    connection = TakeIdle();
  }
  if (connection) {
    return {};
  }
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
  if (result.IsOk()) {
    result = operation(*connection);
  }
  // After a failure the connection is closed, so that the next operation starts with a new one.
  if (result.IsOk()) {
    Release(std::move(connection));
  }
  return result;
}

IndexResult IndexStore::Write(Clock::time_point end, const Operation& operation) {
  const std::unique_lock<std::timed_mutex> lock(writeMutex_, end);
  if (!lock.owns_lock()) {
    return {SQLITE_BUSY, sqlite3_errstr(SQLITE_BUSY)};
  }
  return Read([&](IndexConnection& connection) {
    connection.SetBusyTimeout(LeftUntil(end));
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
  return Write(Clock::now() + kRecordTimeout,
               [&](IndexConnection& connection) { return connection.StoreMedia(path, media); });
}

IndexResult IndexStore::RemoveMedia(std::string_view path) {
  std::optional<StoredMedia> media;
  IndexResult result = FindMedia(path, media);
  if (!result.IsOk() || !media) {
    return result;
  }
  return Write(Clock::now() + kRecordTimeout,
               [&](IndexConnection& connection) { return connection.RemoveMedia(path); });
}

IndexResult IndexStore::Change(Clock::time_point end, bool isDurable, const Operation& change) {
  return Write(end, [&](IndexConnection& connection) {
    return connection.Transact(isDurable, [&] { return change(connection); });
  });
}

IndexResult IndexStore::FindNearestVersion(std::string_view path, std::optional<int32_t>& version) {
  return Read([&](IndexConnection& connection) {
    IndexResult result;
    for (std::string_view at = path; result.IsOk() && !at.empty(); at = ParentOf(at)) {
      result = connection.FindVersion(at, version);
      if (version) {
        break;
      }
    }
    return result;
  });
}

}  // namespace vela

#include "platform/standalone/line_index_cache.h"

#include <fcntl.h>

#include <array>
#include <cerrno>
#include <mutex>
#include <string>

#include "platform/standalone/line_index.h"
#include "posix/file_descriptor.h"
#include "posix/file_version.h"

namespace vela {

namespace {

/// Smaller files are read as fast as they are looked up.
constexpr off_t kSmallestIndexedFile = 65536;

struct IndexedFile {
  std::string path;
  struct stat version = {};
  LineIndex index;
  bool isTooLong = false;  // for an index; known, so that it is not tried again
};

/// Holds an index for each of the few files that one process asks about, the oldest giving way.
class LineIndexCache {
 public:
  std::optional<bool> Find(const char* path, std::string_view text);
  bool IsTooLong(const char* path, const struct stat& now);
  void Add(IndexedFile&& file);

 private:
  const IndexedFile* Current(const char* path, const struct stat& now) const;

  std::mutex mutex_;
  std::array<IndexedFile, 4> files_;
  size_t next_ = 0;
};

const IndexedFile* LineIndexCache::Current(const char* path, const struct stat& now) const {
  for (const IndexedFile& file : files_) {
    if (file.path == path && IsSameVersion(file.version, now)) return &file;
  }
  return nullptr;
}

std::optional<bool> LineIndexCache::Find(const char* path, std::string_view text) {
  struct stat now;
  if (stat(path, &now) != 0 || now.st_size < kSmallestIndexedFile) return std::nullopt;
  const std::lock_guard<std::mutex> lock(mutex_);
  const IndexedFile* file = Current(path, now);
  if (file == nullptr || file->isTooLong) return std::nullopt;
  if (!file->index.MayHold(text)) return false;

  const FileDescriptor fd(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  if (!fd.IsOpen() || fstat(fd.Get(), &now) != 0 || !IsSameVersion(file->version, now))
    return std::nullopt;
  return file->index.Holds(fd.Get(), text);
}

bool LineIndexCache::IsTooLong(const char* path, const struct stat& now) {
  const std::lock_guard<std::mutex> lock(mutex_);
  const IndexedFile* file = Current(path, now);
  return file != nullptr && file->isTooLong;
}

void LineIndexCache::Add(IndexedFile&& file) {
  const std::lock_guard<std::mutex> lock(mutex_);
  for (IndexedFile& other : files_) {
    if (other.path == file.path) {
      other = std::move(file);
      return;
    }
  }
  files_[next_] = std::move(file);
  next_ = (next_ + 1) % files_.size();
}

LineIndexCache& Cache() {
  static LineIndexCache cache;
  return cache;
}

}  // namespace

std::optional<bool> FindLineInIndex(const char* path, std::string_view text) {
  return Cache().Find(path, text);
}

void IndexLines(const char* path, int fd) {
  IndexedFile file;
  if (fstat(fd, &file.version) != 0 || !S_ISREG(file.version.st_mode)) return;
  if (file.version.st_size < kSmallestIndexedFile || !IsAtRest(file.version)) return;
  if (Cache().IsTooLong(path, file.version) || lseek(fd, 0, SEEK_SET) != 0) return;
  const int error = file.index.Read(fd);
  if (error != 0 && error != ENOMEM) return;
  file.isTooLong = error == ENOMEM;
  if (file.isTooLong) file.index = LineIndex();
  file.path = path;
  Cache().Add(std::move(file));
}

}  // namespace vela

#include "platform/standalone/line_index_cache.h"

#include <array>
#include <cerrno>
#include <mutex>
#include <string>

#include "platform/standalone/line_index.h"
#include "posix/file_content.h"
#include "posix/file_descriptor.h"
#include "posix/file_version.h"
#include "posix/files.h"

namespace vela {

namespace {

/// Smaller files are searched without an index as fast as with one.
constexpr int64_t kSmallestIndexedFile = 65536;

struct IndexedFile {
  std::string path;
  FileVersion version;
  LineIndex index;
  bool isTooLong = false;  // too many lines for an index; another attempt would fail too
};

/// A process searches only a few files. The oldest index is replaced when there are more.
class LineIndexCache {
 public:
  std::optional<bool> Find(const char* path, std::string_view text);
  bool IsTooLong(const char* path, const FileVersion& now);
  void Add(IndexedFile&& file);

 private:
  const IndexedFile* Current(const char* path, const FileVersion& now) const;

  std::mutex mutex_;
  std::array<IndexedFile, 4> files_;
  size_t next_ = 0;
};

const IndexedFile* LineIndexCache::Current(const char* path, const FileVersion& now) const {
  for (const IndexedFile& file : files_) {
    if (file.path == path && file.version == now) {
      return &file;
    }
  }
  return nullptr;
}

std::optional<bool> LineIndexCache::Find(const char* path, std::string_view text) {
  FileVersion now;
  if (now.Read(path) != 0 || now.Size() < kSmallestIndexedFile) {
    return std::nullopt;
  }
  const std::lock_guard<std::mutex> lock(mutex_);
  const IndexedFile* file = Current(path, now);
  if (file == nullptr || file->isTooLong) {
    return std::nullopt;
  }
  if (!file->index.MayContain(text)) {
    return false;
  }

  const FileDescriptor fd = OpenForReading(path);
  if (!fd.IsOpen() || now.Read(fd.Get()) != 0 || now != file->version) {
    return std::nullopt;
  }
  return file->index.Contains(fd.Get(), text);
}

bool LineIndexCache::IsTooLong(const char* path, const FileVersion& now) {
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
  if (file.version.Read(fd) != 0 || !file.version.IsRegular()) {
    return;
  }
  if (file.version.Size() < kSmallestIndexedFile || !file.version.IsAtRest()) {
    return;
  }
  if (Cache().IsTooLong(path, file.version) || Rewind(fd) != 0) {
    return;
  }
  const int error = file.index.Read(fd);
  if (error != 0 && error != ENOMEM) {
    return;
  }
  file.isTooLong = error == ENOMEM;
  if (file.isTooLong) {
    file.index = LineIndex();
  }
  file.path = path;
  Cache().Add(std::move(file));
}

}  // namespace vela

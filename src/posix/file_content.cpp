#include "posix/file_content.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <new>
#include <stdexcept>

#include "posix/file_descriptor.h"
#include "posix/files.h"
#include "posix/folder.h"

namespace vela {

namespace {

constexpr size_t kChunkSize = 16384;
constexpr mode_t kWritableByOthers = S_IWGRP | S_IWOTH;

int AppendToEnd(int fd, std::string& content) {
  char chunk[kChunkSize];
  for (;;) {
    size_t got = 0;
    const int error = ReadChunk(fd, chunk, sizeof(chunk), got);
    if (error != 0 || got == 0) {
      return error;
    }
    content.append(chunk, got);
  }
}

/// Returns the content of a regular file; empty for one of more than `limit` bytes and on errors.
std::string ReadSmall(const FileDescriptor& file, const struct stat& status, size_t limit) {
  if (!S_ISREG(status.st_mode) || static_cast<uint64_t>(status.st_size) > limit) {
    return {};
  }
  const auto size = static_cast<size_t>(status.st_size);
  std::string content = ReadAt(file.Get(), 0, size);
  return content.size() == size ? content : std::string();
}

int RepeatSync(int (*sync)(int), int fd) {
  while (sync(fd) != 0) {
    if (errno == EINVAL || errno == ENOSYS || errno == EOPNOTSUPP) {
      return 0;
    }
    if (errno != EINTR) {
      return errno;
    }
  }
  return 0;
}

}  // namespace

int ReadChunk(int fd, char* chunk, size_t size, size_t& got) {
  for (;;) {
    const ssize_t count = read(fd, chunk, size);
    if (count >= 0) {
      got = static_cast<size_t>(count);
      return 0;
    }
    if (errno != EINTR) {
      return errno;
    }
  }
}

std::string ReadAt(int fd, int64_t offset, size_t size) {
  std::string bytes(size, '\0');
  size_t length = 0;
  while (length < size) {
    const off_t position = static_cast<off_t>(offset) + static_cast<off_t>(length);
    const ssize_t got = pread(fd, &bytes[length], size - length, position);
    if (got < 0 && errno == EINTR) {
      continue;
    }
    if (got <= 0) {
      break;
    }
    length += static_cast<size_t>(got);
  }
  bytes.resize(length);
  return bytes;
}

int Rewind(int fd) {
  return lseek(fd, 0, SEEK_SET) < 0 ? errno : 0;
}

int SetFileSize(int fd, int64_t size) {
  return ftruncate(fd, static_cast<off_t>(size)) == 0 ? 0 : errno;
}

int ReadToEnd(int fd, std::string& content) {
  try {
    return AppendToEnd(fd, content);
  } catch (const std::bad_alloc&) {
    return ENOMEM;
  } catch (const std::length_error&) {
    return EFBIG;
  }
}

int ReadFile(const char* path, std::string& content) {
  const FileDescriptor file = OpenForReading(path);
  if (!file.IsOpen()) {
    return errno;
  }
  return ReadToEnd(file.Get(), content);
}

std::string ReadSmallFile(const std::string& path, size_t limit) {
  const FileDescriptor file = FolderEntry(path).Open(O_RDONLY | O_NOFOLLOW);
  struct stat status = {};
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0) {
    return {};
  }
  return ReadSmall(file, status, limit);
}

bool BeginsWith(const std::string& path, std::string_view bytes) {
  const FileDescriptor file = OpenForReading(path);
  return file.IsOpen() && ReadAt(file.Get(), 0, bytes.size()) == bytes;
}

std::string ReadSystemFile(const std::string& path, size_t limit) {
  const FileDescriptor file = OpenForReading(path);
  struct stat status = {};
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0) {
    return {};
  }
  const bool isProtected = status.st_uid == 0 && (status.st_mode & kWritableByOthers) == 0;
  return isProtected ? ReadSmall(file, status, limit) : std::string();
}

unsigned char* FileMapping::Map(int fd, size_t size) {
  Unmap();
  void* const memory = mmap(nullptr, size, PROT_READ, MAP_PRIVATE, fd, 0);
  if (memory == MAP_FAILED) {
    return nullptr;
  }
  memory_ = memory;
  size_ = size;
  return static_cast<unsigned char*>(memory);
}

void FileMapping::Unmap() {
  if (memory_ != nullptr) {
    munmap(memory_, size_);
    memory_ = nullptr;
  }
}

int WriteAll(int fd, std::string_view content) {
  while (!content.empty()) {
    const ssize_t written = write(fd, content.data(), content.size());
    if (written >= 0) {
      content.remove_prefix(static_cast<size_t>(written));
    } else if (errno != EINTR) {
      return errno;
    }
  }
  return 0;
}

int AppendWhole(int fd, std::string_view text) {
  std::string_view rest = text;
  int error = 0;
  while (error == 0 && !rest.empty()) {
    const ssize_t written = write(fd, rest.data(), rest.size());
    if (written >= 0) {
      rest.remove_prefix(static_cast<size_t>(written));
    } else if (errno != EINTR) {
      error = errno;
    }
  }
  if (error == 0 || rest.size() == text.size()) {
    return error;
  }
  // A part of a line would be read as another one. What others have appended behind it stays.
  const auto done = static_cast<off_t>(text.size() - rest.size());
  const off_t end = lseek(fd, 0, SEEK_CUR);
  struct stat status = {};
  if (end < done || fstat(fd, &status) != 0 || status.st_size != end) {
    return error;
  }
  return ftruncate(fd, end - done) == 0 ? error : errno;
}

bool LacksFinalNewline(int fd) {
  struct stat status = {};
  if (fstat(fd, &status) == 0 && status.st_size == 0) {
    return false;
  }
  return ReadAt(fd, status.st_size - 1, 1) != "\n";
}

int FlushFile(int fd) {
  const int copy = fcntl(fd, F_DUPFD_CLOEXEC, 0);
  return copy >= 0 && close(copy) == 0 ? 0 : errno;
}

int SyncOpenFile(int fd) {
  return RepeatSync(fsync, fd);
}

int SyncData(int fd) {
  return RepeatSync(fdatasync, fd);
}

}  // namespace vela

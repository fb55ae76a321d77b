#include "process/source_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

namespace vela {

namespace {

FileType TypeOf(const struct stat& status) {
  switch (status.st_mode & S_IFMT) {
    case S_IFREG:
      return FileType::kRegular;
    case S_IFDIR:
      return FileType::kDirectory;
    case S_IFIFO:
      return FileType::kPipe;
    default:
      return FileType::kOther;
  }
}

}  // namespace

FileType TypeOf(const std::string& path) {
  struct stat status;
  return stat(path.c_str(), &status) == 0 ? TypeOf(status) : FileType::kNone;
}

FileType TypeOf(int descriptor) {
  struct stat status;
  return fstat(descriptor, &status) == 0 ? TypeOf(status) : FileType::kNone;
}

bool PassToPrograms(const FileDescriptor& file) {
  return fcntl(file.Get(), F_SETFD, 0) == 0;
}

FileDescriptor Duplicate(int descriptor) {
  return FileDescriptor(fcntl(descriptor, F_DUPFD_CLOEXEC, 0));
}

std::FILE* OpenStream(int descriptor) {
  FileDescriptor copy = Duplicate(descriptor);
  std::FILE* const stream = copy.IsOpen() ? fdopen(copy.Get(), "rb") : nullptr;
  if (stream != nullptr) {
    copy.Release();
  }
  return stream;
}

int64_t SizeOf(int descriptor) {
  struct stat status;
  return fstat(descriptor, &status) == 0 ? int64_t{status.st_size} : -1;
}

int64_t ReadSome(int descriptor, void* bytes, size_t size) {
  ssize_t count = 0;
  do {
    count = read(descriptor, bytes, size);
  } while (count < 0 && errno == EINTR);
  return count;
}

int64_t ReadSomeAt(int descriptor, void* bytes, size_t size, int64_t offset) {
  ssize_t count = 0;
  do {
    count = pread(descriptor, bytes, size, offset);
  } while (count < 0 && errno == EINTR);
  return count;
}

bool ReadExactly(int descriptor, void* bytes, size_t size) {
  auto* next = static_cast<char*>(bytes);
  while (size > 0) {
    const int64_t count = ReadSome(descriptor, next, size);
    if (count <= 0) {
      return false;
    }
    next += count;
    size -= static_cast<size_t>(count);
  }
  return true;
}

}  // namespace vela

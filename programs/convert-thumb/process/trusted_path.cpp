#include "process/trusted_path.h"

#include <fcntl.h>
#include <linux/magic.h>
#include <sys/stat.h>
#include <sys/vfs.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <string_view>
#include <utility>

namespace vela {

namespace {

constexpr int kDirectory = O_PATH | O_DIRECTORY;
constexpr int kReading = O_RDONLY | O_NONBLOCK | O_NOCTTY;
/// As many as the kernel itself follows.
constexpr int kMostLinks = 40;

bool IsOwnOrRoots(const struct stat& status) {
  return status.st_uid == 0 || status.st_uid == geteuid();
}

/// The last component of a path and everything before it.
struct PathParts {
  std::string directory;
  std::string name;
};

PathParts Split(const std::string& path) {
  const size_t slash = path.rfind('/');
  if (slash == std::string::npos) {
    return {"", path};
  }
  return {path.substr(0, slash + 1), path.substr(slash + 1)};
}

/// Links there are made by the kernel and lead to files that need not have a path.
bool IsInProc(const FileDescriptor& directory) {
  struct statfs status;
  return fstatfs(directory.Get(), &status) == 0 && status.f_type == PROC_SUPER_MAGIC;
}

/// Opens a path one component after the other.
class PathWalk {
 public:
  /// Opens the directory `path`, relative to `base`, for reaching what is below it.
  FileDescriptor OpenDirectory(int base, const std::string& path) {
    const bool isAbsolute = !path.empty() && path.front() == '/';
    FileDescriptor directory(openat(base, isAbsolute ? "/" : ".", kDirectory | O_CLOEXEC));
    size_t begin = path.find_first_not_of('/');
    while (directory.IsOpen() && begin != std::string::npos) {
      const size_t end = path.find('/', begin);
      directory = Open(directory, path.substr(begin, end - begin), kDirectory);
      begin = end == std::string::npos ? end : path.find_first_not_of('/', end);
    }
    return directory;
  }

  /// Opens a name in a directory.
  FileDescriptor Open(const FileDescriptor& directory, const std::string& name, int flags) {
    if (IsInProc(directory)) {
      return FileDescriptor(openat(directory.Get(), name.c_str(), flags | O_CLOEXEC));
    }
    FileDescriptor file(openat(directory.Get(), name.c_str(), flags | O_NOFOLLOW | O_CLOEXEC));
    // A link is not a directory, either.
    if (file.IsOpen() || (errno != ELOOP && errno != ENOTDIR)) {
      return file;
    }
    const int error = errno;
    const FileDescriptor link(
        openat(directory.Get(), name.c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC));
    struct stat status;
    if (!link.IsOpen() || fstat(link.Get(), &status) != 0) {
      return {};
    }
    if (!S_ISLNK(status.st_mode)) {
      errno = error;
      return {};
    }
    return Follow(directory, link, status, flags);
  }

  /// Opens a path relative to `base`.
  FileDescriptor OpenPath(int base, const std::string& path, int flags) {
    const PathParts parts = Split(path);
    const FileDescriptor directory = OpenDirectory(base, parts.directory);
    if (!directory.IsOpen()) {
      return {};
    }
    return Open(directory, parts.name.empty() ? "." : parts.name, flags);
  }

 private:
  FileDescriptor Follow(const FileDescriptor& directory, const FileDescriptor& link,
                        const struct stat& linkStatus, int flags) {
    char text[PATH_MAX];
    const ssize_t length = readlinkat(link.Get(), "", text, sizeof text);
    if (length < 0) {
      return {};
    }
    if (++links_ > kMostLinks) {
      errno = ELOOP;
      return {};
    }
    FileDescriptor target =
        OpenPath(directory.Get(), std::string(text, static_cast<size_t>(length)), flags);
    struct stat status;
    if (!target.IsOpen() || fstat(target.Get(), &status) != 0) {
      return {};
    }
    if (!IsOwnOrRoots(linkStatus) && linkStatus.st_uid != status.st_uid) {
      errno = ELOOP;
      return {};
    }
    return target;
  }

  int links_ = 0;
};

bool IsSameFile(const struct stat& a, const struct stat& b) {
  return a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

/// Returns true when others cannot exchange names in a directory that belong to root or us.
bool ProtectsOwnNames(const struct stat& directory) {
  return IsOwnOrRoots(directory) &&
         ((directory.st_mode & (S_IWGRP | S_IWOTH)) == 0 || (directory.st_mode & S_ISVTX) != 0);
}

}  // namespace

std::optional<Place> FindPlace(const std::string& path) {
  const PathParts parts = Split(path);
  if (parts.name.empty() || parts.name == "." || parts.name == "..") {
    errno = path.empty() ? ENOENT : EISDIR;
    return std::nullopt;
  }
  FileDescriptor directory = PathWalk().OpenDirectory(AT_FDCWD, parts.directory);
  if (!directory.IsOpen()) {
    return std::nullopt;
  }
  return Place{std::move(directory), parts.name};
}

FileDescriptor OpenTrusted(const std::string& path) {
  if (path.empty()) {
    errno = ENOENT;
    return {};
  }
  return PathWalk().OpenPath(AT_FDCWD, path, kReading);
}

bool IsPrivate(const FileDescriptor& directory) {
  struct stat status;
  if (fstat(directory.Get(), &status) != 0 || (status.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    return false;
  }
  FileDescriptor current(openat(directory.Get(), ".", kDirectory | O_CLOEXEC));
  while (current.IsOpen() && fstat(current.Get(), &status) == 0 && ProtectsOwnNames(status)) {
    FileDescriptor above(openat(current.Get(), "..", kDirectory | O_CLOEXEC));
    struct stat aboveStatus;
    if (!above.IsOpen() || fstat(above.Get(), &aboveStatus) != 0) {
      return false;
    }
    if (IsSameFile(status, aboveStatus)) {
      return true;
    }
    current = std::move(above);
  }
  return false;
}

}  // namespace vela

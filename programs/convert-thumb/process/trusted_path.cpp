#include "process/trusted_path.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <utility>

#include "posix/folder.h"

namespace vela {

namespace {

constexpr int kDirectory = O_PATH | O_DIRECTORY;

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

bool IsSameFile(const struct stat& a, const struct stat& b) {
  return a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

/// Returns true when others cannot exchange names in a directory that belong to root or us.
bool ProtectsOwnNames(const struct stat& directory) {
  return IsOwnOrRoots(directory) &&
         ((directory.st_mode & (S_IWGRP | S_IWOTH)) == 0 || (directory.st_mode & S_ISVTX) != 0);
}

/// Returns true when others cannot exchange names of root or us in the directory, nor one of the
/// directories above it.
bool IsProtected(const FileDescriptor& directory) {
  FileDescriptor current(openat(directory.Get(), ".", kDirectory | O_CLOEXEC));
  struct stat status;
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

}  // namespace

std::optional<Place> FindPlace(const std::string& path) {
  const PathParts parts = Split(path);
  if (parts.name.empty() || parts.name == "." || parts.name == "..") {
    errno = path.empty() ? ENOENT : EISDIR;
    return std::nullopt;
  }
  FileDescriptor directory =
      OpenTrusted(AT_FDCWD, parts.directory.empty() ? "." : parts.directory.c_str(), kDirectory);
  if (!directory.IsOpen()) {
    return std::nullopt;
  }
  return Place{std::move(directory), parts.name};
}

FileDescriptor OpenSource(const std::string& path) {
  return OpenTrusted(AT_FDCWD, path.c_str(), O_RDONLY);
}

bool IsPrivate(const FileDescriptor& directory) {
  struct stat status;
  return fstat(directory.Get(), &status) == 0 && (status.st_mode & (S_IWGRP | S_IWOTH)) == 0 &&
         IsProtected(directory);
}

bool ProtectsOwnFiles(const std::string& path) {
  const FileDescriptor directory = OpenTrusted(AT_FDCWD, path.c_str(), kDirectory);
  return directory.IsOpen() && IsProtected(directory);
}

bool IsAbsent(const Place& place) {
  struct stat status;
  return fstatat(place.directory.Get(), place.name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0 &&
         errno == ENOENT;
}

void RemoveRegular(const Place& place) {
  struct stat status;
  if (fstatat(place.directory.Get(), place.name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 &&
      S_ISREG(status.st_mode)) {
    unlinkat(place.directory.Get(), place.name.c_str(), 0);
  }
}

}  // namespace vela

#include "posix/files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>

namespace vela {

namespace {

int ErrnoUnless(bool succeeded) {
  return succeeded ? 0 : errno;
}

/// Returns 0 or an errno value.
int CheckRegular(const struct stat& status) {
  if (S_ISDIR(status.st_mode)) {
    return EISDIR;
  }
  return S_ISREG(status.st_mode) ? 0 : EINVAL;
}

/// Returns whether the last component of `path` is a name of the file with this status, or a link
/// to it that may be followed.
bool IsTrustedName(const char* path, const struct stat& file) {
  struct stat name = {};
  if (lstat(path, &name) != 0) {
    return false;
  }
  if (!S_ISLNK(name.st_mode)) {
    return name.st_dev == file.st_dev && name.st_ino == file.st_ino;
  }
  return name.st_uid == 0 || name.st_uid == geteuid() || name.st_uid == file.st_uid;
}

/// Opens for reading what `located` refers to. Returns 0 or an errno value.
int Reopen(const FileDescriptor& located, FileDescriptor& out) {
  const std::string path = "/proc/self/fd/" + std::to_string(located.Get());
  out = OpenForReading(path);
  return ErrnoUnless(out.IsOpen());
}

}  // namespace

bool IsRegularFileMode(uint32_t mode) {
  return S_ISREG(mode);
}

std::optional<FileStatus> ExamineFile(const char* path) {
  struct stat status = {};
  if (stat(path, &status) != 0) {
    return std::nullopt;
  }
  return FileStatus{S_ISREG(status.st_mode), S_ISDIR(status.st_mode),
                    status.st_size,          status.st_blocks,
                    status.st_mtim.tv_sec,   {status.st_dev, status.st_ino}};
}

bool IsRegularFile(const std::string& path) {
  const std::optional<FileStatus> status = ExamineFile(path);
  return status && status->isRegular;
}

int IdentifyDirectory(const std::string& path, FileIdentity& identity) {
  const std::optional<FileStatus> status = ExamineFile(path);
  if (!status) {
    return errno;
  }
  identity = status->identity;
  return status->isDirectory ? 0 : ENOTDIR;
}

int CheckAccess(const std::string& path, FileAccess access) {
  const int mode = access == FileAccess::kRead ? R_OK : X_OK;
  if (faccessat(AT_FDCWD, path.c_str(), mode, AT_EACCESS) == 0) {
    return 0;
  }
  // Some containers refuse the system call behind it.
  return errno == EPERM ? ErrnoUnless(::access(path.c_str(), mode) == 0) : errno;
}

FileDescriptor OpenForReading(const std::string& path) {
  return FileDescriptor(open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
}

int OpenRegularFile(const char* path, OpenedFile& out) {
  // Unlike an ordinary open, this has no effect on a device or pipe.
  const FileDescriptor located(open(path, O_PATH | O_CLOEXEC));
  struct stat status = {};
  if (!located.IsOpen() || fstat(located.Get(), &status) != 0) {
    return errno;
  }
  const int error = CheckRegular(status);
  if (error != 0) {
    return error;
  }
  // Only after the file has been located: the name may be replaced at any time.
  if (!IsTrustedName(path, status)) {
    return ELOOP;
  }
  out.owner = status.st_uid;
  return Reopen(located, out.file);
}

bool IsProgramToTrust(const std::string& path) {
  struct stat self = {};
  struct stat program = {};
  if (stat("/proc/self/exe", &self) != 0 || lstat(path.c_str(), &program) != 0) {
    return false;
  }
  const bool isOurs = program.st_uid == 0 || program.st_uid == self.st_uid;
  return S_ISREG(program.st_mode) && isOurs && (program.st_mode & S_IWOTH) == 0;
}

FileDescriptor CreateEmptyFile(const std::string& path, unsigned mode) {
  const int flags = O_WRONLY | O_CREAT | O_TRUNC | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
  return FileDescriptor(open(path.c_str(), flags, mode));
}

int CreateDirectory(const std::string& path, unsigned mode) {
  return ErrnoUnless(mkdir(path.c_str(), mode) == 0);
}

int SetFileMode(const std::string& path, unsigned mode) {
  return ErrnoUnless(chmod(path.c_str(), mode) == 0);
}

int RenameFile(const std::string& from, const std::string& to) {
  return ErrnoUnless(std::rename(from.c_str(), to.c_str()) == 0);
}

int RemoveFile(const std::string& path) {
  return ErrnoUnless(unlink(path.c_str()) == 0);
}

int RemoveFileIfPresent(const std::string& path) {
  const int error = RemoveFile(path);
  return error == ENOENT ? 0 : error;
}

int AppendLine(const std::string& path, const std::string& text) {
  const int flags = O_WRONLY | O_CREAT | O_APPEND | O_NOCTTY | O_CLOEXEC;
  const FileDescriptor file(open(path.c_str(), flags, 0644));
  if (!file.IsOpen()) {
    return errno;
  }
  const off_t end = lseek(file.Get(), 0, SEEK_END);
  const std::string line = text + '\n';
  const ssize_t written = write(file.Get(), line.data(), line.size());
  if (written < 0) {
    return errno;
  }
  if (written == static_cast<ssize_t>(line.size())) {
    return 0;
  }
  return ftruncate(file.Get(), end) == 0 ? ENOSPC : errno;
}

std::string FindUnusedPath(const std::string& nameTemplate) {
  std::string path = nameTemplate;
  const FileDescriptor file(mkostemp(path.data(), O_CLOEXEC));
  if (!file.IsOpen()) {
    return {};
  }
  unlink(path.c_str());
  return path;
}

}  // namespace vela

#include "posix/files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "posix/folder.h"

#include "posix/file_content.h"

namespace vela {

namespace {

int ErrnoUnless(bool succeeded) {
  return succeeded ? 0 : errno;
}

}  // namespace

bool IsRegularFileMode(uint32_t mode) {
  return S_ISREG(mode);
}

bool IsDirectoryMode(uint32_t mode) {
  return S_ISDIR(mode);
}

std::optional<FileStatus> ExamineFile(const char* path) {
  struct stat status = {};
  const int error = path == nullptr ? EFAULT : ReadStatus(path, status);
  if (error != 0) {
    errno = error;
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

bool IsProgramToTrust(const std::string& path) {
  struct stat self = {};
  struct stat program = {};
  if (stat("/proc/self/exe", &self) != 0 || lstat(path.c_str(), &program) != 0) {
    return false;
  }
  const bool isOurs = program.st_uid == 0 || program.st_uid == self.st_uid;
  return S_ISREG(program.st_mode) && isOurs && (program.st_mode & S_IWOTH) == 0;
}

int SetFileMode(int fd, unsigned mode) {
  return ErrnoUnless(fchmod(fd, mode) == 0);
}

int64_t SizeOfFile(int fd) {
  struct stat status = {};
  return fstat(fd, &status) == 0 ? int64_t{status.st_size} : 0;
}

int RemoveFile(const std::string& path) {
  return ErrnoUnless(unlink(path.c_str()) == 0);
}

int RemoveFileIfPresent(const std::string& path) {
  const int error = RemoveFile(path);
  return error == ENOENT ? 0 : error;
}

int AppendLine(const std::string& path, const std::string& text) {
  const int flags = O_RDWR | O_CREAT | O_APPEND | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
  FileDescriptor file(open(path.c_str(), flags, 0644));
  if (!file.IsOpen()) {
    return errno;
  }
  const int error = AppendWhole(file.Get(), text + '\n');
  return error != 0 || file.Close() ? error : errno;
}

int SyncNameOf(const std::string& path) {
  const std::string name = path.substr(0, path.rfind('/') + 1);
  const FileDescriptor directory = OpenForReading(name.empty() ? "." : name);
  if (!directory.IsOpen()) {
    // A user may be allowed to create files there, but not to read the directory.
    return errno == EACCES ? 0 : errno;
  }
  // EINVAL: the file system has nothing to wait for.
  return fsync(directory.Get()) == 0 || errno == EINVAL ? 0 : errno;
}

}  // namespace vela

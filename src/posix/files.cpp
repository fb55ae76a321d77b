#include "posix/files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>

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
  const int flags = O_RDWR | O_CREAT | O_APPEND | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
  FileDescriptor file(open(path.c_str(), flags, 0644));
  if (!file.IsOpen()) {
    return errno;
  }
  struct stat status = {};
  if (fstat(file.Get(), &status) != 0) {
    return errno;
  }
  if (!S_ISREG(status.st_mode)) {
    return EINVAL;
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

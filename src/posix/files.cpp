#include "posix/files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "posix/file_content.h"
#include "posix/folder.h"

namespace vela {

namespace {

int ErrnoUnless(bool succeeded) {
  return succeeded ? 0 : errno;
}

/// Opens or creates a regular file. Returns 0 or an errno value.
int OpenForAppending(const std::string& path, FileDescriptor& file) {
  const int flags = O_RDWR | O_CREAT | O_APPEND | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
  file.Reset(open(path.c_str(), flags, 0644));
  struct stat status = {};
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0) {
    return errno;
  }
  return S_ISREG(status.st_mode) ? 0 : EINVAL;
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

bool IsPrivateFile(int fd) {
  struct stat status = {};
  return fstat(fd, &status) == 0 && S_ISREG(status.st_mode) && status.st_nlink == 1 &&
         status.st_uid == geteuid() && (status.st_mode & 077) == 0;
}

int IdentifyDirectory(const std::string& path, FileIdentity& identity) {
  const std::optional<FileStatus> status = ExamineFile(path);
  if (!status) {
    return errno;
  }
  identity = status->identity;
  return status->isDirectory ? 0 : ENOTDIR;
}

int ModeOf(FileAccess access) {
  switch (access) {
    case FileAccess::kRead:
      return R_OK;
    case FileAccess::kWrite:
      return W_OK;
    case FileAccess::kExecute:
      break;
  }
  return X_OK;
}

int CheckAccess(const std::string& path, FileAccess access) {
  const int mode = ModeOf(access);
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

int RenameToNewName(const std::string& from, const std::string& to) {
  if (renameat2(AT_FDCWD, from.c_str(), AT_FDCWD, to.c_str(), RENAME_NOREPLACE) == 0) {
    return 0;
  }
  if (errno != EINVAL && errno != ENOSYS) {
    return errno;
  }
  // The file system does not support that flag.
  if (link(from.c_str(), to.c_str()) != 0) {
    return errno;
  }
  return ErrnoUnless(unlink(from.c_str()) == 0);
}

int AppendLine(const std::string& path, const std::string& text) {
  FileDescriptor file;
  int error = OpenForAppending(path, file);
  if (error == 0) {
    error = AppendWhole(file.Get(), text + '\n');
  }
  return error != 0 ? error : ErrnoUnless(file.Close());
}

int AppendDurably(const std::string& path, const std::vector<std::string>& lines) {
  FileDescriptor file;
  int error = OpenForAppending(path, file);
  if (error != 0) {
    return error;
  }
  std::string text = LacksFinalNewline(file.Get()) ? "\n" : "";
  for (const std::string& line : lines) {
    text += line + '\n';
  }
  error = AppendWhole(file.Get(), text);
  if (error == 0) {
    error = SyncOpenFile(file.Get());
  }
  // Some file systems report only here that the data does not fit.
  if (!file.Close() && error == 0) {
    error = errno;
  }
  return error != 0 ? error : SyncDirectoryOf(path);
}

int SyncFile(const std::string& path) {
  const FileDescriptor file = OpenForReading(path);
  return file.IsOpen() ? SyncOpenFile(file.Get()) : errno;
}

int SyncDirectoryOf(const std::string& path) {
  const std::string directory = path.substr(0, path.rfind('/') + 1);
  const int error = SyncFile(directory.empty() ? std::string(".") : directory);
  // A user may be allowed to create files there, but not to read the directory.
  return error == EACCES ? 0 : error;
}

}  // namespace vela

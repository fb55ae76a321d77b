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

bool IsReadable(const std::string& path) {
  return access(path.c_str(), R_OK) == 0;
}

FileDescriptor OpenForReading(const std::string& path) {
  return FileDescriptor(open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
}

FileDescriptor CreateEmptyFile(const std::string& path, unsigned mode) {
  return FileDescriptor(open(path.c_str(), O_RDWR | O_CREAT | O_TRUNC | O_CLOEXEC, mode));
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

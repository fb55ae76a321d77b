#include "index_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "log.h"
#include "posix/file_descriptor.h"

namespace vela {

namespace {

/// The index tells the names of everybody's photos, also of those in closed directories.
constexpr mode_t kDirectoryMode = 0750;
constexpr mode_t kFileMode = 0640;

constexpr uid_t kSameOwner = static_cast<uid_t>(-1);

void GiveAway(int fd, const std::string& path, const IndexFile& file) {
  if (!file.group || fchown(fd, kSameOwner, *file.group) == 0) return;
  LogLine(LogLevel::kWarning, "database")
      .Add("path", path)
      .Add("gid", *file.group)
      .Add("error", std::strerror(errno))
      .Write();
}

FileDescriptor CreateNew(const std::string& path) {
  return FileDescriptor(open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, kFileMode));
}

}  // namespace

void MakeIndexDirectory(const IndexFile& file) {
  const std::filesystem::path directory = std::filesystem::path(file.path).parent_path();
  if (directory.empty()) return;
  std::error_code ignored;
  std::filesystem::create_directories(directory.parent_path(), ignored);
  if (mkdir(directory.c_str(), kDirectoryMode) != 0) return;
  const int flags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
  const FileDescriptor made(open(directory.c_str(), flags));
  if (!made.IsOpen()) return;
  GiveAway(made.Get(), directory, file);
  fchmod(made.Get(), kDirectoryMode);
}

void MakeIndexFile(const IndexFile& file) {
  FileDescriptor made = CreateNew(file.path);
  if (!made.IsOpen() && errno == ENOENT) {
    MakeIndexDirectory(file);
    made = CreateNew(file.path);
  }
  if (!made.IsOpen()) return;
  GiveAway(made.Get(), file.path, file);
  fchmod(made.Get(), kFileMode);
}

}  // namespace vela

#include "process/output_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <string_view>
#include <utility>

#include "posix/file_content.h"
#include "posix/file_descriptor.h"
#include "process/source_file.h"
#include "process/unfinished_outputs.h"

namespace vela {

namespace {

bool Write(const FileDescriptor& file, const unsigned char* bytes, size_t size) {
  return WriteAll(file.Get(), std::string_view(reinterpret_cast<const char*>(bytes), size)) == 0;
}

/// Access control lists are extended attributes as well.
bool HasExtendedAttributes(const FileDescriptor& file) {
  // Fails on file systems without extended attributes.
  return flistxattr(file.Get(), nullptr, 0) > 0;
}

bool CanBeReplaced(const FileDescriptor& file, const struct stat& status) {
  return S_ISREG(status.st_mode) && status.st_nlink == 1 && status.st_uid == geteuid() &&
         status.st_gid == getegid() && !HasExtendedAttributes(file);
}

/// In the same directory as `path`, for renaming. Short, however long the name of `path` is.
std::string ScratchName(const std::string& path) {
  return path.substr(0, path.rfind('/') + 1) + "VELAPHOTO.tmp." + std::to_string(getpid());
}

/// Creates a new file with exactly these permissions.
FileDescriptor CreateFile(const std::string& path, mode_t mode) {
  const mode_t mask = umask(0);
  FileDescriptor file(open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, mode));
  umask(mask);
  return file;
}

/// Checked because new files may inherit the group and access control list of their directory.
bool HasAttributes(const FileDescriptor& file, const FileAttributes& attributes) {
  struct stat status;
  return fstat(file.Get(), &status) == 0 && status.st_uid == attributes.owner &&
         status.st_gid == attributes.group && status.st_mode == attributes.mode &&
         !HasExtendedAttributes(file);
}

/// After a power failure, the name must not refer to a file whose content was never stored.
bool WriteDurably(FileDescriptor& file, const unsigned char* bytes, size_t size) {
  return Write(file, bytes, size) && fdatasync(file.Get()) == 0 && file.Close();
}

Replacement ReplaceThrough(const std::string& scratch, const std::string& path,
                           const unsigned char* bytes, size_t size, const FileAttributes& former) {
  FileDescriptor file = CreateFile(scratch, former.mode & 07777U);
  if (!file.IsOpen()) {
    return errno == EACCES ? Replacement::kImpossible : Replacement::kFailed;
  }
  if (!HasAttributes(file, former)) {
    return Replacement::kImpossible;
  }
  return WriteDurably(file, bytes, size) && std::rename(scratch.c_str(), path.c_str()) == 0
             ? Replacement::kDone
             : Replacement::kFailed;
}

/// An output that is open for writing.
struct OpenOutput {
  FileDescriptor file;
  bool isDevice = false;
};

/// Opens regular files and character devices only. Does not wait for the reader of a pipe.
OpenOutput OpenForWriting(const std::string& path) {
  FileDescriptor file(
      open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC | O_NOCTTY | O_NONBLOCK, 0666));
  struct stat status;
  const bool isAccepted = file.IsOpen() && fstat(file.Get(), &status) == 0 &&
                          (S_ISREG(status.st_mode) || S_ISCHR(status.st_mode)) &&
                          fcntl(file.Get(), F_SETFL, 0) == 0;
  if (!isAccepted) {
    return {};
  }
  return {std::move(file), S_ISCHR(status.st_mode)};
}

}  // namespace

bool WriteOutputFile(const std::string& path, const unsigned char* bytes, size_t size) {
  if (!RegisterOutput(path)) {
    return false;
  }
  OpenOutput output = OpenForWriting(path);
  if (!output.file.IsOpen()) {
    UnregisterOutput(path);
    return false;
  }
  const bool written = Write(output.file, bytes, size);
  if (output.file.Close() && written) {
    return true;
  }
  if (!output.isDevice) {
    unlink(path.c_str());
  }
  return false;
}

std::optional<ReplaceableFile> ReadReplaceableFile(const std::string& path, size_t limit) {
  const FileDescriptor file(
      open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK | O_NOFOLLOW));
  struct stat status;
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0 || !CanBeReplaced(file, status) ||
      static_cast<size_t>(status.st_size) > limit) {
    return std::nullopt;
  }
  ReplaceableFile content;
  content.attributes = {status.st_uid, status.st_gid, status.st_mode};
  content.bytes.resize(static_cast<size_t>(status.st_size));
  if (!ReadExactly(file.Get(), content.bytes.data(), content.bytes.size())) {
    return std::nullopt;
  }
  return content;
}

Replacement ReplaceFile(const std::string& path, const unsigned char* bytes, size_t size,
                        const FileAttributes& former) {
  const std::string scratch = ScratchName(path);
  // A killed process with the same process id may have left one.
  unlink(scratch.c_str());
  RegisterOutput(scratch);
  const Replacement result = ReplaceThrough(scratch, path, bytes, size, former);
  const int error = errno;
  if (result != Replacement::kDone) {
    unlink(scratch.c_str());
  }
  errno = error;
  return result;
}

}  // namespace vela

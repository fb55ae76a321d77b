#include "encoding/output_file.h"

#include <fcntl.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <utility>

#include "encoding/unfinished_outputs.h"
#include "posix/file_descriptor.h"

namespace vela {

namespace {

bool WriteAll(int descriptor, const unsigned char* bytes, size_t size) {
  while (size > 0) {
    const ssize_t written = write(descriptor, bytes, size);
    if (written < 0 && errno == EINTR) {
      continue;
    }
    if (written <= 0) {
      return false;
    }
    bytes += written;
    size -= static_cast<size_t>(written);
  }
  return true;
}

/// Beside `path`, so that it can be renamed to it. The name is short whatever that of `path` is.
std::string ScratchName(const std::string& path) {
  return path.substr(0, path.rfind('/') + 1) + "VELAPHOTO.tmp." + std::to_string(getpid());
}

/// Opens a new file with exactly these permissions.
FileDescriptor MakeFile(const std::string& path, mode_t mode) {
  const mode_t mask = umask(0);
  FileDescriptor file(open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, mode));
  umask(mask);
  return file;
}

/// Directories give their group and access control lists to new files.
bool IsLike(const FileDescriptor& file, const struct stat& former) {
  struct stat status;
  return fstat(file.Get(), &status) == 0 && status.st_uid == former.st_uid &&
         status.st_gid == former.st_gid && status.st_mode == former.st_mode &&
         !HasExtendedAttributes(file.Get());
}

/// After a crash of the machine, the name must not lead to a file whose content never arrived.
bool WriteForGood(FileDescriptor& file, const unsigned char* bytes, size_t size) {
  return WriteAll(file.Get(), bytes, size) && fdatasync(file.Get()) == 0 && file.Close();
}

Replacement ReplaceThrough(const std::string& scratch, const std::string& path,
                           const unsigned char* bytes, size_t size, const struct stat& former) {
  FileDescriptor file = MakeFile(scratch, former.st_mode & 07777U);
  if (!file.IsOpen()) {
    return errno == EACCES ? Replacement::kImpossible : Replacement::kFailed;
  }
  if (!IsLike(file, former)) {
    return Replacement::kImpossible;
  }
  return WriteForGood(file, bytes, size) && std::rename(scratch.c_str(), path.c_str()) == 0
             ? Replacement::kDone
             : Replacement::kFailed;
}

/// Closed for what is neither a regular file nor a character device. Does not wait for the reader
/// of a pipe.
FileDescriptor OpenForWriting(const std::string& path) {
  FileDescriptor file(
      open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC | O_NOCTTY | O_NONBLOCK, 0666));
  struct stat status;
  const bool isFit = file.IsOpen() && fstat(file.Get(), &status) == 0 &&
                     (S_ISREG(status.st_mode) || S_ISCHR(status.st_mode)) &&
                     fcntl(file.Get(), F_SETFL, 0) == 0;
  return isFit ? std::move(file) : FileDescriptor();
}

}  // namespace

bool WriteOutputFile(const std::string& path, const unsigned char* bytes, size_t size) {
  if (!NoteOutput(path)) {
    return false;
  }
  FileDescriptor file = OpenForWriting(path);
  if (!file.IsOpen()) {
    ForgetOutput(path);
    return false;
  }
  struct stat status;
  const bool isDevice = fstat(file.Get(), &status) == 0 && S_ISCHR(status.st_mode);
  const bool written = WriteAll(file.Get(), bytes, size);
  if (file.Close() && written) {
    return true;
  }
  if (!isDevice) {
    unlink(path.c_str());
  }
  return false;
}

Replacement ReplaceFile(const std::string& path, const unsigned char* bytes, size_t size,
                        const struct stat& former) {
  const std::string scratch = ScratchName(path);
  // A process of that number that was killed may have left one.
  unlink(scratch.c_str());
  NoteOutput(scratch);
  const Replacement result = ReplaceThrough(scratch, path, bytes, size, former);
  const int error = errno;
  if (result != Replacement::kDone) {
    unlink(scratch.c_str());
  }
  errno = error;
  return result;
}

bool HasExtendedAttributes(int descriptor) {
  // File systems without any answer with an error.
  return flistxattr(descriptor, nullptr, 0) > 0;
}

}  // namespace vela

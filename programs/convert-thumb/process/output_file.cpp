#include "process/output_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <string_view>
#include <utility>

#include "posix/file_content.h"
#include "posix/file_descriptor.h"
#include "posix/folder.h"
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

/// For renaming. Short, however long the name of the file is.
std::string ScratchName() {
  return "VELAPHOTO.tmp." + std::to_string(getpid());
}

/// Creates a new file with exactly these permissions.
FileDescriptor CreateFile(const FileDescriptor& directory, const std::string& name, mode_t mode) {
  const mode_t mask = umask(0);
  FileDescriptor file = CreateOutput(directory, name, mode);
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
bool WriteDurably(const FileDescriptor& file, const unsigned char* bytes, size_t size) {
  return Write(file, bytes, size) && fdatasync(file.Get()) == 0;
}

/// Renames the scratch file to the file's name.
bool MoveInto(const Place& place, const std::string& scratch) {
  return renameat(place.directory.Get(), scratch.c_str(), place.directory.Get(),
                  place.name.c_str()) == 0;
}

Replacement FillAndMove(const FileDescriptor& file, const std::string& scratch,
                        const ReplaceableFile& former, const unsigned char* bytes, size_t size) {
  if (!HasAttributes(file, former.attributes)) {
    return Replacement::kImpossible;
  }
  return WriteDurably(file, bytes, size) && MoveInto(former.place, scratch) ? Replacement::kDone
                                                                            : Replacement::kFailed;
}

/// Makes room for a new file. Returns false, with errno set, when something is there that must not
/// be replaced.
bool RemoveFormer(const Place& place) {
  struct stat status;
  if (fstatat(place.directory.Get(), place.name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) {
    return errno == ENOENT;
  }
  if (!IsOwnFileIn(place.directory.Get(), status)) {
    errno = EEXIST;
    return false;
  }
  return unlinkat(place.directory.Get(), place.name.c_str(), 0) == 0;
}

bool IsNullDevice(const struct stat& status) {
  return S_ISCHR(status.st_mode) && status.st_rdev == makedev(1, 3);
}

/// Opens an existing character device that may be written to. A device that others have put there
/// could be any device of the machine; only the null device is always harmless.
FileDescriptor OpenDevice(const Place& place) {
  // Without side effects, whatever is there.
  const FileDescriptor file(openat(place.directory.Get(), place.name.c_str(), O_PATH | O_CLOEXEC));
  struct stat status;
  const bool isAccepted =
      file.IsOpen() && fstat(file.Get(), &status) == 0 &&
      (IsNullDevice(status) || (S_ISCHR(status.st_mode) && IsPrivate(place.directory)));
  if (!isAccepted) {
    return {};
  }
  const std::string path = "/proc/self/fd/" + std::to_string(file.Get());
  return FileDescriptor(open(path.c_str(), O_WRONLY | O_CLOEXEC | O_NOCTTY));
}

}  // namespace

OpenOutput OpenForWriting(const std::string& path) {
  const std::optional<Place> place = FindPlace(path);
  if (!place) {
    return {};
  }
  FileDescriptor device = OpenDevice(*place);
  if (device.IsOpen()) {
    return {std::move(device), true};
  }
  if (!RemoveFormer(*place)) {
    return {};
  }
  return {CreateOutput(place->directory, place->name, 0666), false};
}

bool IsDevice(const std::string& path) {
  struct stat status;
  return stat(path.c_str(), &status) == 0 && S_ISCHR(status.st_mode);
}

bool WriteOutputFile(const std::string& path, const unsigned char* bytes, size_t size) {
  const OpenOutput output = OpenForWriting(path);
  if (!output.file.IsOpen()) {
    return false;
  }
  if (Write(output.file, bytes, size)) {
    return true;
  }
  if (!output.isDevice) {
    RemoveOutput(output.file);
  }
  return false;
}

bool MayBeOverwritten(const std::string& path, const FileDescriptor& file) {
  const std::optional<Place> place = FindPlace(path);
  struct stat opened;
  struct stat named;
  if (!place || fstat(file.Get(), &opened) != 0 ||
      fstatat(place->directory.Get(), place->name.c_str(), &named, AT_SYMLINK_NOFOLLOW) != 0) {
    return false;
  }
  const bool isSame = opened.st_dev == named.st_dev && opened.st_ino == named.st_ino;
  return (isSame && IsOwnFileIn(place->directory.Get(), opened)) || IsPrivate(place->directory);
}

std::optional<ReplaceableFile> ReadReplaceableFile(const std::string& path, size_t limit) {
  std::optional<Place> place = FindPlace(path);
  if (!place) {
    return std::nullopt;
  }
  const FileDescriptor file(openat(place->directory.Get(), place->name.c_str(),
                                   O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK | O_NOFOLLOW));
  struct stat status;
  if (!file.IsOpen() || fstat(file.Get(), &status) != 0 || !CanBeReplaced(file, status) ||
      static_cast<size_t>(status.st_size) > limit) {
    return std::nullopt;
  }
  ReplaceableFile content;
  content.place = std::move(*place);
  content.attributes = {status.st_uid, status.st_gid, status.st_mode};
  content.bytes.resize(static_cast<size_t>(status.st_size));
  if (!ReadExactly(file.Get(), content.bytes.data(), content.bytes.size())) {
    return std::nullopt;
  }
  return content;
}

Replacement ReplaceFile(const ReplaceableFile& former, const unsigned char* bytes, size_t size) {
  const std::string scratch = ScratchName();
  // A killed process with the same process id may have left one.
  unlinkat(former.place.directory.Get(), scratch.c_str(), 0);
  const FileDescriptor file =
      CreateFile(former.place.directory, scratch, former.attributes.mode & 07777U);
  if (!file.IsOpen()) {
    return errno == EACCES ? Replacement::kImpossible : Replacement::kFailed;
  }
  const Replacement result = FillAndMove(file, scratch, former, bytes, size);
  if (result != Replacement::kDone) {
    const int error = errno;
    RemoveOutput(file);
    errno = error;
  }
  return result;
}

}  // namespace vela

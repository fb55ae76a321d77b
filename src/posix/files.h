// Files by path: examining and changing them.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "posix/file_descriptor.h"

namespace vela {

/// Two names of the same file have equal identities.
struct FileIdentity {
  uint64_t device = 0;
  uint64_t inode = 0;
};

constexpr bool operator==(const FileIdentity& a, const FileIdentity& b) {
  return a.device == b.device && a.inode == b.inode;
}
constexpr bool operator<(const FileIdentity& a, const FileIdentity& b) {
  return a.device != b.device ? a.device < b.device : a.inode < b.inode;
}

/// The status of a file.
struct FileStatus {
  bool isRegular = false;
  bool isDirectory = false;
  int64_t size = 0;      ///< bytes
  int64_t blocks = 0;    ///< allocated blocks of 512 bytes
  int64_t modified = 0;  ///< seconds since the epoch
  FileIdentity identity;
};

/// Returns true when the file mode `mode`, with its type bits, is that of a regular file.
bool IsRegularFileMode(uint32_t mode);
/// The same for a directory.
bool IsDirectoryMode(uint32_t mode);

/// Examines the file at `path`, symbolic links followed; in a folder that is held open, only those
/// that can be trusted (posix/folder.h). Returns nothing, with errno set, on failure, also for a
/// null path.
std::optional<FileStatus> ExamineFile(const char* path);
inline std::optional<FileStatus> ExamineFile(const std::string& path) {
  return ExamineFile(path.c_str());
}

/// Returns true when a regular file is at `path`, symbolic links followed.
bool IsRegularFile(const std::string& path);

/// Returns true when the open file `fd` is a regular file with one name that belongs to the
/// effective user and that nobody else may open.
bool IsPrivateFile(int fd);

/// Stores the identity of the directory `path`. Returns 0 or an errno value, ENOTDIR when it is not
/// a directory.
int IdentifyDirectory(const std::string& path, FileIdentity& identity);

/// Kinds of access to a file.
enum class FileAccess {
  kRead,
  kWrite,    ///< for a directory: change the names in it
  kExecute,  ///< for a directory: look up names in it
};

/// Returns 0 when this process has the access to `path`, symbolic links followed, else an errno
/// value.
int CheckAccess(const std::string& path, FileAccess access);

/// Opens the file or directory at `path` for reading; never waits for the writer of a pipe. Returns
/// no open descriptor, with errno set, on failure.
FileDescriptor OpenForReading(const std::string& path);

/// Returns whether a regular file is at `path` that belongs to root or to the owner of the running
/// program and that others cannot change.
bool IsProgramToTrust(const std::string& path);

/// Sets the permission bits of the open file `fd`. Returns 0 or an errno value.
int SetFileMode(int fd, unsigned mode);

/// Returns the size of the open file `fd` in bytes, 0 when it cannot be examined.
int64_t SizeOfFile(int fd);

/// Removes the file at `path`, a symbolic link itself and not its target. Returns 0 or an errno
/// value.
int RemoveFile(const std::string& path);

/// Removes the file at `path` as RemoveFile does. Returns 0 also when it does not exist.
int RemoveFileIfPresent(const std::string& path);

/// Renames a file to a name that no file has. Returns 0 or an errno value, EEXIST when `to` exists.
int RenameToNewName(const std::string& from, const std::string& to);

/// Appends `text` and a newline to the file `path`, created with mode 0644 when missing. A line
/// that does not fit on the volume is removed again. Returns 0 or an errno value, EINVAL for
/// anything but a regular file. The line is not yet on the disk.
int AppendLine(const std::string& path, const std::string& text);

/// Appends the lines, each with its newline, as AppendLine does: all or none. They begin on a new
/// line of the file, and are on the disk when this returns 0.
int AppendDurably(const std::string& path, const std::vector<std::string>& lines);

/// Writes the content of the file or directory `path` to the disk. Returns 0, also when its file
/// system cannot do that for this kind of file, or an errno value.
int SyncFile(const std::string& path);

/// Does the same with the directory of `path`: new, renamed and removed names in it. Returns 0 also
/// when the user may not read the directory.
int SyncDirectoryOf(const std::string& path);

}  // namespace vela

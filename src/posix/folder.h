// Files in directories that other users can change.
//
// The owner of a directory, and everybody who may write to it, can replace any component of a path
// by a symbolic link between two system calls. Everything here therefore works on descriptors: a
// folder is opened once, and its entries are reached through it by their names.
//
// A symbolic link is followed only when it is trusted: its owner is root, the user with whose
// rights this process accesses files, or the owner of what it leads to. Otherwise the calls below
// fail with ELOOP.
#pragma once

#include <dirent.h>
#include <sys/stat.h>

#include <string>

#include "posix/file_descriptor.h"
#include "posix/files.h"
#include "posix/signal_block.h"

namespace vela {

/// Opens `path`, which may be relative to the directory `at` (AT_FDCWD: the working directory),
/// with the flags of open(2), which must not create anything; a pipe is never waited for. Returns
/// no open descriptor, with errno set, on failure.
FileDescriptor OpenTrusted(int at, const char* path, int flags);

/// Returns true when the kernel can open a path without following links, which saves opening its
/// components one by one.
bool CanRefuseLinks();

/// Keeps the directory at `path` open while the object exists: every FolderEntry in it that the
/// same thread makes meanwhile uses it, whatever happens to the path. Objects must end in the
/// reverse order of their creation.
class HeldFolder {
 public:
  explicit HeldFolder(const std::string& path);
  ~HeldFolder();
  HeldFolder(const HeldFolder&) = delete;
  HeldFolder& operator=(const HeldFolder&) = delete;

  /// Returns 0 when the folder is open, else the errno value of the attempt to open it.
  int Error() const { return error_; }

 private:
  bool isOwner_ = false;  ///< false when the path was held before
  int error_ = 0;
};

/// Returns true when the directory at `path` is held open.
bool IsFolderHeld(const std::string& path);

/// Returns true when `path` is that of an entry of a folder that is held open, or of the folder.
bool IsInHeldFolder(const std::string& path);

/// Returns false when the directory that is held open for `path` is no longer the one at that path,
/// because it, or a directory above it, has been renamed or removed; true when none is held.
bool IsInPlace(const std::string& path);

/// Returns true for a regular file with a single name that a program of this user has created: no
/// other user can lose anything by a change of it.
bool IsOwnFile(const struct stat& status);

/// Does the same for a file in the open directory `folder`. On file systems that give all files an
/// owner of their own, creates and removes a file there to find out which.
bool IsOwnFileIn(int folder, const struct stat& status);

/// One name in a directory, which need not exist. Functions that return an int return 0 or an errno
/// value; when the directory cannot be opened, all of them fail.
class FolderEntry {
 public:
  explicit FolderEntry(const std::string& path);

  /// Examines the file; a trusted link is followed.
  int Examine(struct stat& status) const;

  /// Examines a symbolic link itself and not its target.
  int ExamineLink(struct stat& status) const;

  /// Opens the file or directory with the flags of open(2); a trusted link is followed, and a pipe
  /// never waited for. The flags must not create anything. Returns no open descriptor, with errno
  /// set, on failure.
  FileDescriptor Open(int flags) const;

  /// Opens a file for reading that a program of this user has made: a regular file with a single
  /// name, owned by this user, not reached by a link, and not older than what this process has last
  /// created there. Returns no open descriptor, with errno set (EPERM for any other file), on
  /// failure.
  FileDescriptor OpenOwn() const;

  /// Creates the file, which must not exist, with exactly these permission bits, and opens it for
  /// writing. Returns no open descriptor, with errno set, on failure.
  FileDescriptor Create(unsigned mode) const;

  /// Removes what has the name, if anything, and creates the file as above.
  FileDescriptor CreateAnew(unsigned mode) const;

  /// Creates a directory with these permission bits.
  int CreateDirectory(unsigned mode) const;

  /// Removes the file, a symbolic link itself and not its target.
  int Remove() const;

  /// Renames the file, replacing what has the name `to`.
  int RenameTo(const FolderEntry& to) const;

  /// Returns true when the name still belongs to the open file `fd`.
  bool IsFile(int fd) const;

 private:
  const char* Name() const { return name_.c_str(); }

  FileDescriptor opened_;  ///< of a directory that is not held
  int folder_ = -1;        ///< descriptor of the directory
  int error_ = 0;          ///< why there is none
  std::string name_;
};

/// Examines the file at `path`: that of a held folder as FolderEntry::Examine does, any other with
/// all links followed. Returns 0 or an errno value.
int ReadStatus(const std::string& path, struct stat& status);

/// Opens the file or directory at `path` for reading; never waits. Returns no open descriptor, with
/// errno set, on failure.
FileDescriptor OpenEntry(const std::string& path);

/// A file that is open for reading, and the user id of its owner.
struct OpenedFile {
  FileDescriptor file;
  uint32_t owner = 0;
};

/// Opens the regular file at `path` for reading, without any effect on other kinds of files. Waits
/// only shortly for the holder of a lease. Returns 0 or an errno value: EISDIR for a directory,
/// EINVAL for any other file that is not regular.
int OpenRegularFile(const std::string& path, OpenedFile& out);

/// Opens the directory at `path` to list its entries. The caller closes the stream. Returns null,
/// with errno set, on failure.
DIR* OpenDirectoryStream(const std::string& path);

/// Removes the file at `path`, a symbolic link itself and not its target. Returns 0 or an errno
/// value.
int RemoveEntry(const std::string& path);

/// Replaces the X's at the end of `nameTemplate` so that no file has the resulting path. Returns an
/// empty string when no file can be created there.
std::string FindUnusedPath(const std::string& nameTemplate);

/// A new directory in /tmp for files of this user's programs, which no other user can enter.
/// Removed with its files, but not with directories in it, at the end. SIGINT, SIGTERM and SIGHUP
/// are blocked until then, so that they do not leave it behind.
class ScratchDirectory {
 public:
  ScratchDirectory();
  ~ScratchDirectory();
  ScratchDirectory(const ScratchDirectory&) = delete;
  ScratchDirectory& operator=(const ScratchDirectory&) = delete;

  /// Returns its path, empty when it could not be created.
  const std::string& Path() const { return path_; }

 private:
  SignalBlock block_{SIGINT, SIGTERM, SIGHUP};
  std::string path_ = "/tmp/velathumb.XXXXXX";
};

}  // namespace vela

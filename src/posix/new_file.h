// New files that are written in steps and moved into place when complete.
#pragma once

#include <string>
#include <string_view>

#include "posix/file_descriptor.h"

namespace vela {

/// A name in a directory that is kept open: what others do to the directories above it or to links
/// on the way does not change where it leads.
class FilePlace {
 public:
  /// Finds the place of `path`. Symbolic links are followed when they belong to root, to this
  /// process's user or to the owner of what they lead to. A link at the end of the path that is not
  /// followed, or leads nowhere, is the place itself.
  explicit FilePlace(const std::string& path);

  /// Returns 0, or an errno value when there is no such place: EACCES when a link on the way is not
  /// followed, EISDIR for a directory, EEXIST for anything else that must not be replaced by a
  /// file.
  int Error() const { return error_; }

 private:
  friend class NewFile;

  int Find(const std::string& path);
  int FollowLinksAtEnd();
  int MoveAlong(const FileDescriptor& link);
  int ErrorOfFile() const;

  FileDescriptor directory_;
  std::string name_;
  int links_ = 0;  // followed so far
  int error_ = 0;
};

/// A new file, written sequentially through a buffer. The first failure is remembered; later calls
/// have no effect.
class NewFile {
 public:
  enum class Kind {
    kScratch,  ///< unnamed: disappears with the object, however the program ends
    kResult,   ///< under a temporary name until MoveTo; otherwise removed with the object
  };

  /// Creates the file in the directory of `place`, which must exist for longer than this object,
  /// with the default permissions.
  NewFile(const FilePlace& place, Kind kind);
  ~NewFile();
  NewFile(const NewFile&) = delete;
  NewFile& operator=(const NewFile&) = delete;

  void Append(std::string_view text);
  /// Appends the whole content of `source`.
  void AppendAllOf(NewFile& source);
  /// Discards the content.
  void Clear();

  /// Writes a kResult file to the disk and gives it the name of its place, replacing any existing
  /// file. Returns 0 or an errno value.
  int MoveToPlace();

  /// Returns the errno value of the first failure, 0 without one.
  int Error() const { return error_; }

 private:
  void Open(Kind kind);
  bool OpenNamed();
  bool SyncDirectory() const;
  void Write(std::string_view text);
  void Flush();
  void Remember(bool isSuccess);

  const FilePlace& place_;
  FileDescriptor file_;
  int error_ = 0;
  std::string name_;    // in the directory of the place; empty for a file without one
  std::string buffer_;  // not written yet
};

}  // namespace vela

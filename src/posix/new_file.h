// New files that are written in steps and moved into place when complete.
#pragma once

#include <string>
#include <string_view>

#include "posix/file_descriptor.h"

namespace vela {

/// A new file, written sequentially through a buffer. The first failure is remembered; later calls
/// have no effect.
class NewFile {
 public:
  enum class Kind {
    kScratch,  ///< unnamed: disappears with the object, however the program ends
    kResult,   ///< under a temporary name until MoveTo; otherwise removed with the object
  };

  /// Creates the file in `directory`, with the default permissions.
  NewFile(const std::string& directory, Kind kind);
  ~NewFile();
  NewFile(const NewFile&) = delete;
  NewFile& operator=(const NewFile&) = delete;

  void Append(std::string_view text);
  /// Appends the whole content of `source`.
  void AppendAllOf(NewFile& source);
  /// Discards the content.
  void Clear();

  /// Writes a kResult file to the disk and renames it to `path`, in the directory given at
  /// construction, replacing any existing file. Returns 0 or an errno value.
  int MoveTo(const std::string& path);

  /// Returns the errno value of the first failure, 0 without one.
  int Error() const { return error_; }

 private:
  void Open(const std::string& directory, Kind kind);
  bool OpenNamed(const std::string& directory);
  void Write(std::string_view text);
  void Flush();
  void Remember(bool isSuccess);

  FileDescriptor file_;
  int error_ = 0;
  std::string name_;    // empty for a file without one
  std::string buffer_;  // not written yet
};

}  // namespace vela

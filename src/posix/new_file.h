// New files that are written piece by piece, and put in place when they are whole.
#pragma once

#include <string>
#include <string_view>

#include "posix/file_descriptor.h"

namespace vela {

/// A new file, written from its beginning on through a buffer. The first failure is remembered and
/// makes every later call do nothing.
class NewFile {
 public:
  enum class Kind {
    kScratch,  ///< without a name: gone with the object, however the program ends
    kResult,   ///< under a temporary name until MoveTo; otherwise removed with the object
  };

  /// Creates the file in `directory`, with the permissions of any new file.
  NewFile(const std::string& directory, Kind kind);
  ~NewFile();
  NewFile(const NewFile&) = delete;
  NewFile& operator=(const NewFile&) = delete;

  void Append(std::string_view text);
  /// Appends all that has been appended to `source`.
  void AppendAllOf(NewFile& source);
  /// Discards the content.
  void Clear();

  /// Writes a kResult file to the disk and renames it to `path`, in the directory given at
  /// construction, replacing a file that is there. Returns 0 or an errno value.
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

// Files that a page is put together in.
#pragma once

#include <string>
#include <string_view>

namespace vela {

/// A new file, written from its beginning on through a buffer. The first failure is remembered and
/// makes every later call do nothing.
class PageFile {
 public:
  enum class Kind {
    kScratch,  ///< under no name: gone with the object, however the program ends
    kResult,   ///< under a name of its own until MoveTo; removed with the object otherwise
  };

  /// Makes the file in `directory`, with the permissions of any new file.
  PageFile(const std::string& directory, Kind kind);
  ~PageFile();
  PageFile(const PageFile&) = delete;
  PageFile& operator=(const PageFile&) = delete;

  void Append(std::string_view text);
  /// Appends all that has been appended to `source`.
  void AppendAllOf(PageFile& source);
  /// Forgets the content.
  void Clear();

  /// Puts a kResult file, safely on the disk, in place of what stands at `path`, in the directory
  /// given at construction. Returns 0, or an errno value.
  int MoveTo(const std::string& path);

  /// Returns the errno value of the first failure, 0 without one.
  int Error() const { return error_; }

 private:
  void Open(const std::string& directory, Kind kind);
  bool OpenNamed(const std::string& directory);
  void Write(std::string_view text);
  void Flush();
  void Remember(bool isDone);

  int file_ = -1;
  int error_ = 0;
  std::string name_;    // empty for a file without one
  std::string buffer_;  // not written yet
};

}  // namespace vela

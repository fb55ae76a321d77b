// The entries of one directory.
#pragma once

#include <dirent.h>

#include <memory>
#include <string>

#include "posix/folder.h"

namespace vela {

/// An open directory, closed with the object. Of the links in its path only those that can be
/// trusted are followed (posix/folder.h).
class DirectoryEntries {
 public:
  DirectoryEntries() = default;
  explicit DirectoryEntries(const std::string& dir) : stream_(OpenDirectoryStream(dir)) {}

  bool IsOpen() const { return stream_ != nullptr; }

  /// Returns the next entry's name, "." and ".." included, in the order in which the system lists
  /// them; null at the end. It lives until the next call.
  const char* NextName() {
    const dirent* entry = readdir(stream_.get());
    return entry == nullptr ? nullptr : entry->d_name;
  }

 private:
  struct Closer {
    void operator()(DIR* stream) const { closedir(stream); }
  };
  std::unique_ptr<DIR, Closer> stream_;
};

}  // namespace vela

// The entries of one directory.
#pragma once

#include <dirent.h>

#include <memory>

namespace vela {

/// An open directory, closed with the object.
class DirectoryEntries {
 public:
  DirectoryEntries() = default;
  explicit DirectoryEntries(const char* dir) : stream_(opendir(dir)) {}

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

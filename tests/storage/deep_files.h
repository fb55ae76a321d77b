// Files that are nested too deeply or have too long a name for any path. Each is removed by its
// object, because the sandbox removes files by path.
#pragma once

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <string>
#include <utility>

#include "support/descriptor.h"
#include "support/files.h"

namespace vela_test {

inline Descriptor OpenDirectory(const std::string& path, int above = AT_FDCWD) {
  return Descriptor(openat(above, path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
}

/// Makes an empty file in an open directory; returns whether that succeeded.
inline bool MakeFileAt(const Descriptor& directory, const std::string& name) {
  return Descriptor(openat(directory.Get(), name.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0644))
      .IsOpen();
}

/// The empty file `name` in an existing directory.
class FileInDirectory {
 public:
  FileInDirectory(const std::string& dir, std::string name)
      : directory_(OpenDirectory(dir)), name_(std::move(name)) {
    EXPECT_TRUE(MakeFileAt(directory_, name_)) << name_;
  }
  ~FileInDirectory() { unlinkat(directory_.Get(), name_.c_str(), 0); }
  FileInDirectory(const FileInDirectory&) = delete;
  FileInDirectory& operator=(const FileInDirectory&) = delete;

 private:
  Descriptor directory_;
  std::string name_;
};

/// `depth` directories called `name`, each inside the previous one, the first in `top`, and in each
/// of them the empty file `file`.
class DeepTree {
 public:
  DeepTree(const std::string& top, const std::string& name, int depth, const std::string& file)
      : first_(top + "/" + name), file_(file), depth_(depth), name_(name) {
    MakeDirectories(top);
    Descriptor directory = OpenDirectory(top);
    for (int level = 0; level < depth; ++level) {
      EXPECT_EQ(mkdirat(directory.Get(), name.c_str(), 0777), 0) << level;
      directory = OpenDirectory(name, directory.Get());
      EXPECT_TRUE(MakeFileAt(directory, file)) << level;
    }
  }
  /// Removes the first level and puts the next in its place, until none is left.
  ~DeepTree() {
    const std::string rest = first_.substr(0, first_.rfind('/')) + "/.rest";
    for (int level = 0; level < depth_; ++level) {
      std::rename((first_ + "/" + name_).c_str(), rest.c_str());
      unlink((first_ + "/" + file_).c_str());
      rmdir(first_.c_str());
      std::rename(rest.c_str(), first_.c_str());
    }
  }
  DeepTree(const DeepTree&) = delete;
  DeepTree& operator=(const DeepTree&) = delete;

 private:
  const std::string first_;
  const std::string file_;
  const int depth_;
  const std::string name_;
};

}  // namespace vela_test

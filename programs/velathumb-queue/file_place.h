// Whether an open file is still where it was opened.
#pragma once

#include <sys/stat.h>

#include <string>

namespace vela {

/// Returns whether the open file `descriptor` is the one at `path`.
inline bool IsAtPath(int descriptor, const std::string& path) {
  struct stat open = {};
  struct stat named = {};
  return fstat(descriptor, &open) == 0 && stat(path.c_str(), &named) == 0 &&
         open.st_dev == named.st_dev && open.st_ino == named.st_ino;
}

}  // namespace vela

// What this process has open.
#pragma once

#include <fcntl.h>
#include <unistd.h>

#include <climits>
#include <cstdlib>
#include <string>
#include <vector>

#include "support/files.h"

namespace vela_test {

/// The path (or "socket:[...]" and the like) that a descriptor leads to.
inline std::string TargetOf(int descriptor) {
  char target[PATH_MAX] = "";
  const std::string link = "/proc/self/fd/" + std::to_string(descriptor);
  const ssize_t length = readlink(link.c_str(), target, sizeof target - 1);
  return length < 0 ? std::string() : std::string(target, static_cast<size_t>(length));
}

/// The descriptors that lead to `path`.
inline std::vector<int> DescriptorsOf(const std::string& path) {
  std::vector<int> found;
  for (const std::string& name : ListDirectory("/proc/self/fd")) {
    const int descriptor = std::atoi(name.c_str());
    if (TargetOf(descriptor) == path) {
      found.push_back(descriptor);
    }
  }
  return found;
}

}  // namespace vela_test

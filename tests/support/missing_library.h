// A machine that lacks a library.
#pragma once

#include <string>
#include <vector>

namespace vela_test {

/// As long as the object exists, no program that is started can load the library: an empty file
/// hides it. Programs that have already loaded it are not affected.
class MissingLibrary {
 public:
  /// `name`: that of the library's file up to ".so", such as "libavformat".
  explicit MissingLibrary(const std::string& name);
  ~MissingLibrary();
  MissingLibrary(const MissingLibrary&) = delete;
  MissingLibrary& operator=(const MissingLibrary&) = delete;

 private:
  std::vector<std::string> hidden_;
};

}  // namespace vela_test

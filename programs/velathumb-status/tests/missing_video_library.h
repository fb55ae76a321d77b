// A machine without the library that reads videos.
#pragma once

#include <string>
#include <vector>

namespace vela_test {

/// For as long as the object lives, no program that is started can load the library: an empty file
/// hides it. Programs that have loaded it keep it.
class MissingVideoLibrary {
 public:
  MissingVideoLibrary();
  ~MissingVideoLibrary();
  MissingVideoLibrary(const MissingVideoLibrary&) = delete;
  MissingVideoLibrary& operator=(const MissingVideoLibrary&) = delete;

 private:
  std::vector<std::string> hidden_;
};

}  // namespace vela_test

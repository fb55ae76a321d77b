// A private place: a directory of the sandbox with a memory volume of its own.
#pragma once

#include <cstdint>
#include <string>

namespace vela_test {

class PrivatePlace {
 public:
  /// Mounts an empty volume at the directory `path`, which exists. `mode` is its permission bits,
  /// `limit` its size as the kernel's memory volumes take it ("64m").
  PrivatePlace(std::string path, unsigned mode, const std::string& limit);

  /// Empties it and unmounts everything mounted on it or in it.
  void Restore() const;

 private:
  std::string path_;
  unsigned mode_;
  uint64_t mount_;
};

}  // namespace vela_test

// The positions of the lines of a large file, so that it is read once and not for every search.
#pragma once

#include <cstdint>
#include <string_view>
#include <vector>

namespace vela {

/// The lines of one version of a file.
class LineIndex {
 public:
  /// Reads the open file `fd`, whose position is its beginning. Returns 0 or an errno value, ENOMEM
  /// for a file with too many lines.
  int Read(int fd);

  /// Returns whether a line has the hash of the text. If not, no line equals the text.
  bool MayContain(std::string_view text) const;

  /// Returns whether a line of the open file `fd`, which must be the version that was read, equals
  /// the text.
  bool Contains(int fd, std::string_view text) const;

 private:
  struct Line {
    uint64_t hash;
    int64_t begin;
  };

  std::vector<Line>::const_iterator First(uint64_t hash) const;

  std::vector<Line> lines_;  // sorted by hash
};

}  // namespace vela

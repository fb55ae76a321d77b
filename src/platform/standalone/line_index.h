// Where the lines of a large file are, so that it is read once and not for each question.
#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <string_view>
#include <vector>

namespace vela {

/// The lines of one version of a file.
class LineIndex {
 public:
  /// Reads the open file `fd` from its present position, the begin. Returns 0 or an errno value;
  /// ENOMEM for a file of too many lines.
  int Read(int fd);

  /// Returns whether a line of the text's hash exists; without one no line equals the text.
  bool MayHold(std::string_view text) const;

  /// Returns whether a line of the open file `fd`, which must be the version that was read, equals
  /// the text.
  bool Holds(int fd, std::string_view text) const;

 private:
  struct Line {
    uint64_t hash;
    off_t begin;
  };

  std::vector<Line>::const_iterator First(uint64_t hash) const;

  std::vector<Line> lines_;  // by hash
};

}  // namespace vela

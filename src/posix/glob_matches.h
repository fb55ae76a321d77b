// The paths that match a shell pattern.
#pragma once

#include <glob.h>

#include <string>

namespace vela {

/// Expands a shell pattern; contains no paths when nothing matches or the expansion fails. The
/// paths are sorted and live as long as the object. Directories are opened, and links followed, as
/// posix/folder.h describes.
class GlobMatches {
 public:
  explicit GlobMatches(const std::string& pattern);
  ~GlobMatches() { globfree(&matches_); }
  GlobMatches(const GlobMatches&) = delete;
  GlobMatches& operator=(const GlobMatches&) = delete;

  const char* const* begin() const { return matches_.gl_pathv; }
  const char* const* end() const { return begin() + (found_ ? matches_.gl_pathc : 0); }

 private:
  glob_t matches_ = {};
  bool found_ = false;
};

/// Returns a pattern that matches exactly `path`, whatever characters it contains.
std::string EscapePattern(const std::string& path);

}  // namespace vela

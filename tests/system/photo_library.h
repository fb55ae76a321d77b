// The photos and videos that the programs process, and the state of their thumbnails.
#pragma once

#include <set>
#include <string>
#include <vector>

namespace vela_test {

/// The state of a photo's six thumbnails.
struct PhotoState {
  int thumbs = 0;                   ///< complete JPEGs
  int markers = 0;                  ///< failure markers in place of a thumbnail
  std::vector<std::string> others;  ///< all other files in its metadata directory
};

constexpr int kThumbsOfAPhoto = 6;

/// Small photos of several kinds in directories and a tree, a damaged one in a separate directory,
/// and two videos.
class PhotoLibrary {
 public:
  /// Makes `count` photos, one of them raw and one damaged, and the videos.
  explicit PhotoLibrary(int count);

  /// Makes one more directory with `count` photos, one of them raw.
  void AddDirectory(int count);

  /// Makes a directory with `count` photos, one of them raw, that is not among the entries.
  void AddLoneDirectory(int count);

  /// The queue entries for everything but the lone directory.
  std::vector<std::string> Entries() const { return entries_; }

  /// The directory that is not among the entries.
  const std::string& LoneEntry() const { return loneEntry_; }
  bool IsLone(const std::string& photo) const;

  const std::set<std::string>& Photos() const { return photos_; }
  const std::string& Damaged() const { return damaged_; }
  const std::vector<std::string>& Videos() const { return videos_; }

  /// Sets the time of every `step`-th photo to now, later than its thumbnails; skips the damaged
  /// one and those of the lone directory.
  void Touch(int step);

 private:
  void MakePhotos(const std::vector<std::string>& directories, int count);

  std::vector<std::string> entries_;
  std::string loneEntry_;
  std::set<std::string> photos_;
  std::string damaged_;
  std::vector<std::string> videos_;
};

/// Reads a photo's thumbnails; an unreadable one fails the test.
PhotoState StateOf(const std::string& photo);

}  // namespace vela_test

// The configured thumbnails of one directory.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

/// One configured thumbnail; never changed after it is built.
class ThumbnailProfile {
 public:
  /// `size` is the edge length of the box in pixels, `filename` one of the size classes' file
  /// names, in either form.
  ThumbnailProfile(int32_t size, int32_t quality, std::string unsharp, std::string filename,
                   int32_t phase);

  int32_t size() const { return size_; }
  int32_t quality() const { return quality_; }
  std::string unsharp() const { return unsharp_; }
  /// The file name as configured.
  std::string filename() const { return filename_; }
  /// The file name under which the thumbnail is written.
  std::string thumbName() const { return thumbName_; }
  /// The phase as configured, not normalised.
  int32_t phase() const { return phase_; }
  /// True when the thumbnail fills its box, false when it fits into it.
  bool fillArea() const { return fillArea_; }

 private:
  int32_t size_;
  int32_t quality_;
  std::string unsharp_;
  std::string filename_;
  std::string thumbName_;
  int32_t phase_;
  bool fillArea_;
};

/// The accepted profiles of a directory, ascending by size, with a view for each phase.
struct ThumbnailProfileList {
  std::vector<std::unique_ptr<const ThumbnailProfile>> all;  ///< owns the profiles
  std::vector<const ThumbnailProfile*> phase0;
  std::vector<const ThumbnailProfile*> phase1;
  std::vector<const ThumbnailProfile*> phase2;
};

namespace vela {

/// Phase index that means all profiles.
inline constexpr int kAllPhases = -1;

}  // namespace vela

/// Reads the profile file into the empty `list`, keeping the profiles whose size class the index
/// library requests for `dirPath`. Returns 1 (also when none was kept), or 0 when the file cannot
/// be loaded.
int ParseThumbnailProfiles(ThumbnailProfileList& list, const std::string& profileFilePath,
                           const std::string& dirPath);

/// Returns the number of profiles of a phase; of all for any index other than 0, 1 and 2.
int GetProfileCount(const ThumbnailProfileList& list, int phaseIndex);

/// Returns the profile at `position` (from 0) of a phase, chosen as in GetProfileCount, or null
/// past the end.
const ThumbnailProfile* GetProfileAt(const ThumbnailProfileList& list, int position,
                                     int phaseIndex);

/// Returns true when `a` is smaller than `b`: profiles are sorted by ascending size.
bool ProfileSortPredicate(const ThumbnailProfile& a, const ThumbnailProfile& b);

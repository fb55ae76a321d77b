// Directories of media files and the work that is pending in them.
#pragma once

#include <ostream>
#include <string>

#include "storage/media_fixture.h"
#include "storage/velamk_thumb_status.h"
#include "support/files.h"

namespace vela_test {

/// Photos with missing thumbnails, and missing thumbnails.
struct PhotoWork {
  int photos = -77;
  int thumbs = -77;
};
inline bool operator==(const PhotoWork& a, const PhotoWork& b) {
  return a.photos == b.photos && a.thumbs == b.thumbs;
}
inline void PrintTo(const PhotoWork& work, std::ostream* out) {
  *out << work.photos << " photos, " << work.thumbs << " thumbs";
}

inline PhotoWork WorkInDirectory(const std::string& dir) {
  PhotoWork work;
  GetDirThumbStatus(dir.c_str(), &work.photos, &work.thumbs);
  return work;
}

/// Makes a photo without thumbnails, dated kMediaTime.
inline void MakePhoto(const std::string& path) {
  WriteFile(path, "photo");
  SetFileTime(path, kMediaTime);
}

/// Makes the thumbnails of the media file `dir`/`name` whose bits are set in `sizeMap`, `seconds`
/// newer than it.
inline void MakeThumbs(const std::string& dir, const std::string& name, int sizeMap,
                       int64_t seconds = 1) {
  for (int row = 0; row < 6; ++row) {
    if ((sizeMap & 1 << row) != 0) {
      const std::string thumb = dir + "/@eaDir/" + name + "/" + kThumbNames[row];
      WriteFile(thumb, "thumb");
      SetFileTime(thumb, kMediaTime + seconds);
    }
  }
}

/// A test with a directory to fill.
class TreeTest : public QuietTest {
 protected:
  static constexpr const char* kTop = "/tmp/tree";

  void SetUp() override {
    QuietTest::SetUp();
    MakeDirectories(kTop);
  }

  static std::string In(const std::string& name) { return std::string(kTop) + "/" + name; }
};

/// A path of exactly `length` bytes below /tmp that is a directory.
inline std::string DirectoryOfLength(size_t length) {
  const std::string path = PathOfLength(length, "d");
  MakeDirectories(path);
  return path;
}

}  // namespace vela_test

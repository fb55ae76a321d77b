// Files as cameras wrote them, from a folder that a machine may have.

#include "likeness/makers.h"
#include "likeness/source.h"
#include "likeness/vectors.h"
#include "support/build_paths.h"

namespace vela_test {

std::vector<LikenessSource> CameraFileSources() {
  const std::string media = SharedMediaDirectory();
  if (media.empty()) {
    return {};
  }
  std::vector<LikenessSource> sources;
  for (const char* name :
       {"phone_8mp.jpg", "phone_gps.jpg", "compact.jpg", "no_exif.jpg", "landscape_1.jpg",
        "landscape_6.jpg", "portrait_8.jpg", "phone_12mp.heic", "scan.tiff"}) {
    const std::string file = name;
    const std::string extension = file.substr(file.rfind('.') + 1);
    sources.push_back(
        {"Camera", file, extension, Copied(media + "/" + file), PhotographVectors(), true});
  }
  for (const char* name : {"corrupted.jpg", "invalid.jpg"}) {
    sources.push_back(
        {"Camera", name, "jpg", Copied(media + "/" + name), PhotographVectors(), true});
  }
  return sources;
}

}  // namespace vela_test

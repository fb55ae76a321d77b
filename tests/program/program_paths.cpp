#include "program/program_paths.h"

#include <cstdlib>

#include "support/files.h"

namespace vela_test {

std::string InPhotos(const std::string& name) {
  return std::string(kPhotos) + "/" + name;
}

std::string MetadataDirOf(const std::string& photo) {
  const size_t slash = photo.rfind('/');
  return photo.substr(0, slash) + "/@eaDir" + photo.substr(slash);
}

std::string Thumb(const std::string& photo, const std::string& sizeClass) {
  return MetadataDirOf(photo) + "/VELAPHOTO_THUMB_" + sizeClass + ".jpg";
}

std::string OldThumb(const std::string& photo, const std::string& sizeClass) {
  return MetadataDirOf(photo) + "/VELAPHOTO:THUMB_" + sizeClass + ".jpg";
}

std::string Marker(const std::string& photo, const std::string& sizeClass) {
  return MetadataDirOf(photo) + "/VELAPHOTO_THUMB_" + sizeClass + ".fail";
}

int Progress(const std::string& key) {
  if (!Exists(kPhotoProgress)) {
    return 0;
  }
  const std::string beginning = key + "=\"";
  for (const std::string& line : ReadLines(kPhotoProgress)) {
    if (line.compare(0, beginning.size(), beginning) == 0) {
      return std::atoi(line.c_str() + beginning.size());
    }
  }
  return 0;
}

std::vector<std::string> ArgumentsFor(const std::vector<std::string>& directories) {
  std::vector<std::string> arguments = {kProfiles};
  arguments.insert(arguments.end(), directories.begin(), directories.end());
  return arguments;
}

}  // namespace vela_test

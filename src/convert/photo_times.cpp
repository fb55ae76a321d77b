#include "convert/photo_times.h"

namespace vela {

namespace {

constexpr int kSetAccessAndModification = 3;

}  // namespace

void CopyPhotoTime(const std::string& path, const VLIBCFileStatus& photo) {
  const VLIBCTime modified = {photo.modification.seconds, 0};
  const VLIBCFileTimes times = {modified, modified, photo.change};
  VLIBCFileUTime(path.c_str(), kSetAccessAndModification, &times);
}

}  // namespace vela

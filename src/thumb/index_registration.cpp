#include "thumb/index_registration.h"

#include <json/value.h>

#include <cstring>

#include "platform/velaindex.h"
#include "posix/identity.h"
#include "posix/log.h"
#include "source/raw_image.h"
#include "storage/log_source.h"

using namespace vela;

namespace {

/// Fills path and pixel size of an image. Returns false when the size cannot be read, which is
/// logged with the caller's `line`.
bool DescribeImage(const std::string& path, int line, VELA_MEDIA_INFO& out) {
  std::memset(&out, 0, sizeof out);
  path.copy(out.path, sizeof out.path - 1);
  if (GetImageResolution(path, out.width, out.height) == 1) {
    return true;
  }
  LogError(kProgramLogSource, line, "[Error] GetImageResolution: " + path);
  return false;
}

}  // namespace

void RegisterThumbConversion(const std::string& photoPath, const std::string& thumbPath) {
  VELA_MEDIA_INFO photo;
  VELA_MEDIA_INFO thumb;
  if (!DescribeImage(photoPath, 469, photo) || !DescribeImage(thumbPath, 474, thumb)) {
    return;
  }
  const OwnIdentity own;
  VELAIDX_IndexConvertAdd(photo, thumb, Json::Value(Json::objectValue));
}

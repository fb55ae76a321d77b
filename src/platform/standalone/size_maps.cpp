#include <cerrno>

#include "platform/standalone/last_error.h"
#include "platform/standalone/settings.h"
#include "platform/velaindex.h"

namespace {

int GetSizeMap(int kind, int32_t* sizeMap) {
  if (sizeMap == nullptr) return velaplatform::Fail(EINVAL);
  switch (kind) {
    case THUMB_TYPE_PHOTO:
      *sizeMap = velaplatform::CurrentSettings().photoThumbSizeMap;
      return 0;
    case THUMB_TYPE_VIDEO:
      *sizeMap = velaplatform::CurrentSettings().videoThumbSizeMap;
      return 0;
    default:
      return velaplatform::Fail(EINVAL);
  }
}

}  // namespace

int VELAIDX_GetThumbSizeMap(const char* /*path*/, int kind, int32_t* sizeMap) {
  return GetSizeMap(kind, sizeMap);
}

int VELAIDX_GetDirThumbSizeMap(const char* /*dir*/, int kind, int32_t* sizeMap) {
  return GetSizeMap(kind, sizeMap);
}

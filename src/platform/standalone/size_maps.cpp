#include <cerrno>

#include "platform/standalone/last_error.h"
#include "platform/standalone/settings.h"
#include "platform/velaindex.h"

namespace {

int GetSizeMap(int kind, int32_t* sizeMap) {
  if (sizeMap == nullptr) {
    return vela::Fail(EINVAL);
  }
  switch (kind) {
    case THUMB_TYPE_PHOTO:
      *sizeMap = vela::CurrentSettings().photoThumbSizeMap;
      return 0;
    case THUMB_TYPE_VIDEO:
      *sizeMap = vela::CurrentSettings().videoThumbSizeMap;
      return 0;
    default:
      return vela::Fail(EINVAL);
  }
}

}  // namespace

int VELAIDX_GetThumbSizeMap(const char* /*path*/, int kind, int32_t* sizeMap) {
  return GetSizeMap(kind, sizeMap);
}

int VELAIDX_GetDirThumbSizeMap(const char* /*dir*/, int kind, int32_t* sizeMap) {
  return GetSizeMap(kind, sizeMap);
}

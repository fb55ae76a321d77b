#include <cerrno>

#include "header/header_reader.h"
#include "platform/standalone/last_error.h"
#include "platform/velaindex.h"

int VELAIndexImgResGet(const char* path, uint32_t* width, uint32_t* height) {
  if (path == nullptr || width == nullptr || height == nullptr) {
    return vela::Fail(EINVAL);
  }
  const int error = vela::ReadImageSize(path, *width, *height);
  return error == 0 ? 0 : vela::Fail(error);
}

// The pixel size of an image file.

#include <cstdlib>

#include "input_file.h"
#include "platform/velaindex.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const InputFile file(data, size);
  uint32_t width = 0;
  uint32_t height = 0;
  const bool isRead = VELAIndexImgResGet(file.Path().c_str(), &width, &height) == 0;
  if (isRead != (width != 0) || isRead != (height != 0)) {
    std::abort();
  }
  return 0;
}

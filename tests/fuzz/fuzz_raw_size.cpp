// The pixel size of a raw photo, as the decoder prints it.

#include <cstdlib>

#include "source/raw_image.h"
#include "tool_output_fake.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  SetToolOutput(data, size);
  uint32_t width = 0;
  uint32_t height = 0;
  const bool isRead = GetRawImageSize("photo.nef", width, height) == 1;
  if (isRead != (width != 0) || isRead != (height != 0)) {
    std::abort();
  }
  return 0;
}

// The EXIF orientation of a raw photo's preview.

#include <cstdlib>

#include "input_file.h"
#include "source/orientation.h"
#include "tool_output_fake.h"

extern "C" int LLVMFuzzerInitialize(int* /*count*/, char*** /*arguments*/) {
  SetToolOutput("Rotation: 90\n");
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const InputFile preview(data, size);
  const int degrees = GetRawPreviewRotation("photo.nef", preview.Path());
  if (degrees != 0 && degrees != 90) {
    std::abort();
  }
  return 0;
}

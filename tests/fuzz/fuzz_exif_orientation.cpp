// The EXIF orientation of a raw photo's preview.

#include <cstdlib>
#include <cstring>

#include "answer.h"
#include "input_file.h"

using namespace vela;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const InputFile preview(data, size);
  const HeaderAnswer answer = Answer({HeaderTopic::kExifOrientation}, preview.Descriptor());
  const size_t length = strnlen(answer.orientation, kOrientationTextSize);
  if (length == kOrientationTextSize || (answer.isRead == 0 && length != 0)) {
    std::abort();
  }
  return 0;
}

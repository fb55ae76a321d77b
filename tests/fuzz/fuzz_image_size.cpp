// The pixel size of an image file.

#include <cstdlib>

#include "answer.h"
#include "image_size.h"
#include "input_file.h"

using namespace vela;

extern "C" int LLVMFuzzerInitialize(int* /*count*/, char*** /*arguments*/) {
  InitializeImageLibrary();
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const InputFile file(data, size);
  const HeaderAnswer answer = Answer({HeaderTopic::kImageSize}, file.Descriptor());
  const bool isRead = answer.isRead != 0;
  if (isRead != (answer.width != 0) || isRead != (answer.height != 0)) {
    std::abort();
  }
  return 0;
}

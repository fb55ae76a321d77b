// The rotation of a raw photo whose preview is upright, as the metadata tool prints it.

#include <cstdlib>
#include <string_view>

#include "input_file.h"
#include "source/orientation.h"
#include "tool_output_fake.h"

namespace {

/// A JPEG that contains only an EXIF block with one entry: upright orientation.
constexpr uint8_t kUprightPreview[] = {0xff, 0xd8, 0xff, 0xe1, 0x00, 0x22, 'E',  'x',  'i',  'f',
                                       0x00, 0x00, 'M',  'M',  0x00, 0x2a, 0x00, 0x00, 0x00, 0x08,
                                       0x00, 0x01, 0x01, 0x12, 0x00, 0x03, 0x00, 0x00, 0x00, 0x01,
                                       0x00, 0x01, 0x00, 0x00, 0x00, 0x00, 0x00, 0x00, 0xff, 0xd9};

int ReadRotation() {
  static const InputFile preview(kUprightPreview, sizeof kUprightPreview);
  return GetRawPreviewRotation("photo.nef", preview.Path());
}

}  // namespace

/// The tool is started only for upright previews; if the preview were not recognized as upright,
/// the target would test nothing.
extern "C" int LLVMFuzzerInitialize(int* /*count*/, char*** /*arguments*/) {
  SetToolOutput("Rotation: 90\n");
  if (ReadRotation() != 90) {
    std::abort();
  }
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  SetToolOutput(data, size);
  const std::string_view output(reinterpret_cast<const char*>(data), size);
  if (ReadRotation() != 0 && output.find("Rotation:") == std::string_view::npos) {
    std::abort();
  }
  return 0;
}

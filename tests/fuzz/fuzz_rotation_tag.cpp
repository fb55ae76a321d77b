// The rotation of a raw photo whose preview is upright, as the metadata tool prints it.

#include <cstdlib>
#include <string_view>

#include "header/header_reader.h"
#include "source/orientation.h"
#include "tool_output_fake.h"

/// Replaces the reader of headers: the preview is upright.
std::optional<std::string> vela::ReadExifOrientation(const std::string& /*path*/) {
  return "top - left";
}

namespace {

int ReadRotation() {
  return GetRawPreviewRotation("photo.nef", "preview.jpg");
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

// A photo, from decoding to the finished thumbnails.

#include <fcntl.h>

#include <cstdlib>
#include <memory>
#include <string_view>

#include "decoding/photo_opener.h"
#include "input_file.h"
#include "posix/file_descriptor.h"
#include "process/output_file.h"
#include "thumbnails/thumbnails.h"

using namespace vela;

namespace {

/// Well below the fuzzer's memory limit, so that exceeding that limit indicates a leak.
constexpr size_t kMemoryLimit = size_t{32} << 20;
/// Larger pictures would take too long.
constexpr int64_t kMostPixels = 1000000;

Step MakeStep(Step::Kind kind, int quarterTurns = 0) {
  Step step;
  step.kind = kind;
  step.quarterTurns = quarterTurns;
  return step;
}

OutputPlan MakeOutput(const std::string& path, const ThumbnailBox& box, int quarterTurns) {
  OutputPlan output;
  output.box = box;
  output.quality = 85;
  output.steps = {MakeStep(Step::Kind::kFlatten), MakeStep(Step::Kind::kAutoOrient),
                  MakeStep(Step::Kind::kTurn, quarterTurns), MakeStep(Step::Kind::kSharpen),
                  MakeStep(Step::Kind::kConvertToSrgb)};
  output.path = path;
  return output;
}

bool IsWholeJpeg(std::string_view bytes) {
  return bytes.size() > 4 && bytes.substr(0, 2) == "\xFF\xD8" &&
         bytes.substr(bytes.size() - 2) == "\xFF\xD9";
}

bool IsSmall(const PhotoReader& reader) {
  const PictureSize size = reader.FullSize();
  return int64_t{size.width} * size.height <= kMostPixels;
}

}  // namespace

namespace vela {

// Replaces that of the program, whose list of files would grow with every run.
bool WriteOutputFile(const std::string& /*path*/, const unsigned char* bytes, size_t size) {
  if (!IsWholeJpeg({reinterpret_cast<const char*>(bytes), size})) {
    std::abort();
  }
  return true;
}

}  // namespace vela

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const InputFile input(data, size);
  ConversionPlan plan;
  plan.source = input.Path();
  plan.firstPageOnly = true;
  // Rotated outputs are made from whole pictures, others while the photo is being decoded.
  const int quarterTurns = static_cast<int>(size % 2);
  plan.outputs = {MakeOutput("first.jpg", {100, 80, false}, quarterTurns),
                  MakeOutput("second.jpg", {20, 20, true}, quarterTurns)};
  const FileDescriptor file(open(input.Path().c_str(), O_RDONLY | O_CLOEXEC));
  const std::unique_ptr<PhotoReader> reader = OpenPhoto(file.Get(), plan, kMemoryLimit);
  if (reader == nullptr || !CanMakeThumbnails(reader->Traits(), plan) || !IsSmall(*reader)) {
    return 0;
  }
  MakeThumbnails(*reader, plan, kMemoryLimit);
  return 0;
}

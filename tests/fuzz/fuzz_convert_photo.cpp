// A photo, from decoding to the finished thumbnails.

#include <fcntl.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <memory>

#include "decoding/photo_opener.h"
#include "input_file.h"
#include "posix/file_descriptor.h"
#include "process/unfinished_outputs.h"
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

bool IsWholeJpeg(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  const std::string bytes((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
  return bytes.size() > 4 && bytes.compare(0, 2, "\xFF\xD8") == 0 &&
         bytes.compare(bytes.size() - 2, 2, "\xFF\xD9") == 0;
}

bool IsSmall(const PhotoReader& reader) {
  const PictureSize size = reader.FullSize();
  return int64_t{size.width} * size.height <= kMostPixels;
}

}  // namespace

namespace vela {

// Replace those of the program, whose list would grow with every run.
bool RegisterOutput(const std::string& /*path*/) {
  return true;
}

void UnregisterOutput(const std::string& /*path*/) {}

}  // namespace vela

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const InputFile input(data, size);
  const InputFile first(nullptr, 0);
  const InputFile second(nullptr, 0);
  ConversionPlan plan;
  plan.source = input.Path();
  plan.firstPageOnly = true;
  // Rotated outputs are made from whole pictures, others while the photo is being decoded.
  const int quarterTurns = static_cast<int>(size % 2);
  plan.outputs = {MakeOutput(first.Path(), {100, 80, false}, quarterTurns),
                  MakeOutput(second.Path(), {20, 20, true}, quarterTurns)};
  const FileDescriptor file(open(input.Path().c_str(), O_RDONLY | O_CLOEXEC));
  const std::unique_ptr<PhotoReader> reader = OpenPhoto(file.Get(), plan, kMemoryLimit);
  if (reader == nullptr || !CanMakeThumbnails(reader->Traits(), plan) || !IsSmall(*reader)) {
    return 0;
  }
  if (MakeThumbnails(*reader, plan, kMemoryLimit) &&
      (!IsWholeJpeg(first.Path()) || !IsWholeJpeg(second.Path()))) {
    std::abort();
  }
  return 0;
}

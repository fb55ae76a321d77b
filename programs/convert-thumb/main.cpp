// convert-thumb: makes all thumbnails of a photo in one run.

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <optional>
#include <string>
#include <vector>

#include "image_magick.h"
#include "jpeg_reader.h"
#include "memory_limit.h"
#include "plan_parser.h"
#include "thumb/descriptor.h"
#include "thumbnails.h"

namespace {

constexpr int kDone = 0;
constexpr int kFailed = 1;

/// Returns only when ImageMagick could not be started.
int LeaveToImageMagick(const std::vector<std::string>& arguments) {
  HandOver(arguments);
  return kFailed;
}

bool IsRegularFile(int descriptor) {
  struct stat status;
  return fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode);
}

bool IsJpeg(int descriptor) {
  constexpr unsigned char kBeginning[] = {0xFF, 0xD8, 0xFF};
  unsigned char bytes[sizeof kBeginning];
  return pread(descriptor, bytes, sizeof bytes, 0) == sizeof bytes &&
         std::memcmp(bytes, kBeginning, sizeof bytes) == 0;
}

int Convert(const ConversionPlan& plan, const std::vector<std::string>& arguments) {
  // Opening must not wait when the source is a pipe.
  const Descriptor file(open(plan.source.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK));
  if (!file.IsOpen()) {
    std::fprintf(stderr, "convert-thumb: cannot open %s: %s\n", plan.source.c_str(),
                 std::strerror(errno));
    return kFailed;
  }
  if (!IsRegularFile(file.Get()) || !IsJpeg(file.Get())) {
    return LeaveToImageMagick(arguments);
  }
  const size_t memoryLimit = ConversionMemoryLimit();
  JpegReader reader(file.Get(), memoryLimit);
  if (!reader.ReadHeader()) {
    return LeaveToImageMagick(arguments);
  }
  return MakeThumbnails(reader, plan, memoryLimit) ? kDone : kFailed;
}

int Run(const std::vector<std::string>& arguments) {
  const std::optional<ConversionPlan> plan = ParseConversion(arguments);
  return plan ? Convert(*plan, arguments) : LeaveToImageMagick(arguments);
}

}  // namespace

int main(int argc, char** argv) {
  try {
    return Run(std::vector<std::string>(argv + (argc > 0 ? 1 : 0), argv + argc));
  } catch (const std::exception& error) {
    std::fprintf(stderr, "convert-thumb: %s\n", error.what());
    return kFailed;
  }
}

#include "imagemagick/image_magick_limits.h"

#include <cmath>
#include <cstdlib>
#include <cstring>
#include <string>

#include "process/resource_limits.h"

namespace vela {

namespace {

constexpr char kMemoryLimitVariable[] = "MAGICK_MEMORY_LIMIT";
/// For memory-mapped files, whose memory the kernel can reclaim. Larger pictures are read and
/// written in pieces, which takes five times as long.
constexpr char kMapLimitVariable[] = "MAGICK_MAP_LIMIT";

constexpr char kDiskLimitVariable[] = "MAGICK_DISK_LIMIT";

/// Of the library that starts ImageMagick's threads. It ends the process when it cannot start one.
constexpr char kThreadLimitVariable[] = "OMP_THREAD_LIMIT";

/// Parses a size such as "64MiB"; negative if the text is not a number.
double Bytes(const char* text) {
  constexpr char kPrefixes[] = "kmgt";
  constexpr double kThousand = 1000;
  constexpr double kBinaryThousand = 1024;
  char* end = nullptr;
  const double number = std::strtod(text, &end);
  if (end == text) {
    return -1;
  }
  const char letter = *end == '\0' ? '\0' : static_cast<char>(*end | 0x20);
  const char* const prefix = letter == '\0' ? nullptr : std::strchr(kPrefixes, letter);
  if (prefix == nullptr) {
    return number;
  }
  const double unit = end[1] == 'i' || end[1] == 'I' ? kBinaryThousand : kThousand;
  return number * std::pow(unit, static_cast<double>(prefix - kPrefixes + 1));
}

bool IsLower(const char* text, size_t limit) {
  const double bytes = text == nullptr ? -1 : Bytes(text);
  return bytes >= 0 && bytes <= static_cast<double>(limit);
}

void LimitTo(size_t limit, const char* variable) {
  if (!IsLower(std::getenv(variable), limit)) {
    setenv(variable, std::to_string(limit).c_str(), 1);
  }
}

}  // namespace

void LimitImageMagick(size_t memoryLimit) {
  LimitTo(memoryLimit / 2, kMemoryLimitVariable);
  LimitTo(memoryLimit, kMapLimitVariable);
  if (!HasMemoryForThreads(memoryLimit)) {
    setenv(kThreadLimitVariable, "1", 1);
  }
}

void KeepImageMagickFromUsingFiles() {
  LimitTo(0, kMapLimitVariable);
  LimitTo(0, kDiskLimitVariable);
}

}  // namespace vela

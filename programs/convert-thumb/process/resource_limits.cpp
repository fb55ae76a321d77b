#include "process/resource_limits.h"

#include <algorithm>
#include <cstdio>
#include <limits>
#include <optional>

#include "configuration/setting_values.h"
#include "configuration/settings.h"
#include "platform/system_rules.h"
#include "platform/vlibc.h"
#include "posix/confinement.h"
#include "process/worker_threads.h"

namespace vela {

namespace {

/// Returns the memory limit of the process.
size_t ProcessMemoryLimit(size_t memoryLimit) {
  const size_t besides = kBaseMemory + kStackMemory * ProcessorCount();
  const size_t most = std::numeric_limits<size_t>::max() - besides;
  return std::min(memoryLimit, most) + besides;
}

}  // namespace

size_t ConversionMemoryLimit() {
  const auto normal = static_cast<size_t>(DefaultConvertMemory());
  char text[64] = "";
  if (VLIBCFileGetKeyValue(kSettingsFile, kConvertMemoryKey, text, sizeof text, 0) <= 0 ||
      *text == '\0') {
    return normal;
  }
  const std::optional<size_t> limit = ParseByteCount(text);
  if (!limit) {
    std::fprintf(stderr, "convert-thumb: %s: %s is not a number of bytes, using %zu\n",
                 kSettingsFile, kConvertMemoryKey, normal);
  }
  return limit.value_or(normal);
}

void LimitResources(size_t memoryLimit) {
  ResourceLimits limits;
  limits.memory = ProcessMemoryLimit(memoryLimit);
  limits.processorSeconds = kMaxProcessorSeconds;
  LowerLimits(limits);
}

bool HasMemoryForThreads(size_t memoryLimit) {
  return !IsMemoryLimitedBelow(ProcessMemoryLimit(memoryLimit));
}

}  // namespace vela

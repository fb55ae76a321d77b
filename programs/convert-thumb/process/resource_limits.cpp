#include "process/resource_limits.h"

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <limits>
#include <optional>
#include <string_view>
#include <system_error>

#include "platform/system_rules.h"
#include "platform/vlibc.h"
#include "posix/confinement.h"
#include "process/worker_threads.h"

namespace vela {

namespace {

constexpr char kKey[] = "convert_memory_limit";
constexpr size_t kDefaultLimit = CONVERT_THUMB_MEMORY_LIMIT;

/// Returns how often the suffix of a number doubles it; empty for an unknown suffix.
std::optional<int> Doublings(std::string_view unit) {
  constexpr std::string_view kUnits = "kmg";
  constexpr int kDoublingsEach = 10;
  if (unit.empty()) {
    return 0;
  }
  const size_t index = kUnits.find(static_cast<char>(unit.front() | 0x20));
  if (unit.size() > 1 || index == std::string_view::npos) {
    return std::nullopt;
  }
  return kDoublingsEach * static_cast<int>(index + 1);
}

/// Empty unless the text is a size of at least 1 byte.
std::optional<size_t> ParseSize(std::string_view text) {
  const char* const last = text.data() + text.size();
  size_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), last, number);
  if (error != std::errc() || number == 0) {
    return std::nullopt;
  }
  const std::optional<int> doublings =
      Doublings(std::string_view(end, static_cast<size_t>(last - end)));
  if (!doublings || number > std::numeric_limits<size_t>::max() >> *doublings) {
    return std::nullopt;
  }
  return number << *doublings;
}

/// Returns the memory limit of the process.
size_t ProcessMemoryLimit(size_t memoryLimit) {
  const size_t besides = kBaseMemory + kStackMemory * ProcessorCount();
  const size_t most = std::numeric_limits<size_t>::max() - besides;
  return std::min(memoryLimit, most) + besides;
}

}  // namespace

size_t ConversionMemoryLimit() {
  char text[64] = "";
  if (VLIBCFileGetKeyValue(kSettingsFile, kKey, text, sizeof text, 0) <= 0 || *text == '\0') {
    return kDefaultLimit;
  }
  const std::optional<size_t> limit = ParseSize(text);
  if (!limit) {
    std::fprintf(stderr, "convert-thumb: %s: %s is not a number of bytes, using %zu\n",
                 kSettingsFile, kKey, kDefaultLimit);
  }
  return limit.value_or(kDefaultLimit);
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

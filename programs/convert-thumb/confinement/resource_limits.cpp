#include "confinement/resource_limits.h"

#include <sched.h>
#include <sys/resource.h>

#include <algorithm>
#include <limits>

namespace vela {

namespace {

/// Between the signal and the end by force.
constexpr rlim_t kSecondsToEnd = 5;

void Lower(int resource, rlim_t soft, rlim_t hard) {
  const auto kind = static_cast<__rlimit_resource>(resource);
  rlimit limit = {};
  if (getrlimit(kind, &limit) != 0) {
    return;
  }
  limit.rlim_max = std::min(limit.rlim_max, hard);
  limit.rlim_cur = std::min({limit.rlim_cur, limit.rlim_max, soft});
  setrlimit(kind, &limit);
}

size_t Processors() {
  cpu_set_t processors;
  CPU_ZERO(&processors);
  // Fails on machines with more processors than the set has room for.
  return sched_getaffinity(0, sizeof processors, &processors) == 0
             ? static_cast<size_t>(CPU_COUNT(&processors))
             : size_t{CPU_SETSIZE};
}

void LimitMemory(size_t memoryLimit) {
// The memory that a sanitizer keeps for itself is many times any limit.
#if !defined(CONVERT_THUMB_SANITIZED)
  const size_t besides = kMemoryBesides + kStackMemory * Processors();
  const size_t most = std::numeric_limits<size_t>::max() - besides;
  const rlim_t limit = std::min(memoryLimit, most) + besides;
  Lower(RLIMIT_DATA, limit, limit);
#else
  static_cast<void>(memoryLimit);
  static_cast<void>(Processors);
#endif
}

}  // namespace

void LimitResources(size_t memoryLimit) {
  LimitMemory(memoryLimit);
  Lower(RLIMIT_CPU, kMostProcessorSeconds, kMostProcessorSeconds + kSecondsToEnd);
}

}  // namespace vela

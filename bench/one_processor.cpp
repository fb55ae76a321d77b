#include "one_processor.h"

#include "timed_run.h"

namespace vela_bench {

OneProcessor::OneProcessor() {
  int first = 0;
  if (sched_getaffinity(0, sizeof before_, &before_) != 0) {
    Fail("cannot read the processor affinity");
  }
  while (first < CPU_SETSIZE - 1 && !CPU_ISSET(first, &before_)) {
    ++first;
  }
  cpu_set_t one;
  CPU_ZERO(&one);
  CPU_SET(first, &one);
  if (sched_setaffinity(0, sizeof one, &one) != 0) {
    Fail("cannot set the processor affinity");
  }
}

OneProcessor::~OneProcessor() {
  sched_setaffinity(0, sizeof before_, &before_);
}

int UsableProcessors() {
  cpu_set_t usable;
  CPU_ZERO(&usable);
  return sched_getaffinity(0, sizeof usable, &usable) == 0 ? CPU_COUNT(&usable) : 1;
}

}  // namespace vela_bench

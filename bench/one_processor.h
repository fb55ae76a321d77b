// Restricts programs to one processor.
#pragma once

#include <sched.h>

namespace vela_bench {

/// During its lifetime, this process and its children run on one of the available processors.
class OneProcessor {
 public:
  OneProcessor();
  ~OneProcessor();
  OneProcessor(const OneProcessor&) = delete;
  OneProcessor& operator=(const OneProcessor&) = delete;

 private:
  cpu_set_t before_ = {};
};

/// Returns the number of processors that this process may use.
int UsableProcessors();

}  // namespace vela_bench

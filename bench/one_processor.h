// Keeps programs on one processor.
#pragma once

#include <sched.h>

namespace vela_bench {

/// While it lives, this process and what it starts run on one of the processors they may use.
class OneProcessor {
 public:
  OneProcessor();
  ~OneProcessor();
  OneProcessor(const OneProcessor&) = delete;
  OneProcessor& operator=(const OneProcessor&) = delete;

 private:
  cpu_set_t before_ = {};
};

/// How many processors this process may use.
int UsableProcessors();

}  // namespace vela_bench

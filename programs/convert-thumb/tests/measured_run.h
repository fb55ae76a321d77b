// Runs a program and measures its memory.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "support/program.h"

namespace vela_test {

/// How a program ended and the memory it used, including child processes that it waited for.
struct MeasuredRun {
  int exitCode = -1;      ///< -1 when a signal ended it
  bool timedOut = false;  ///< killed at its time limit
  size_t peakMemory = 0;  ///< bytes of memory in use at once, of the largest process
  std::string error;      ///< the beginning of its standard error
};

/// Starts it and waits for its end.
MeasuredRun RunMeasured(const std::string& path, const std::vector<std::string>& arguments,
                        const ProgramOptions& options = ProgramOptions());

}  // namespace vela_test

// Runs a program and tells what it took.
#pragma once

#include <functional>
#include <string>
#include <vector>

namespace vela_bench {

/// What one run took.
struct Cost {
  double wallSeconds = 0;
};

/// Runs `command` (path first) with its output thrown away, and waits for it. Ends the benchmark
/// with a message when it does not exit with 0. `whileRunning`, when given, is called with its
/// process id every few milliseconds.
Cost TimedRun(const std::vector<std::string>& command,
              const std::function<void(int)>& whileRunning = nullptr);

/// Runs both commands alternately, `rounds` times each, and returns the cost of the fastest run of
/// each: what other work on the machine adds falls on both, and only ever adds.
struct CostPair {
  Cost subject;
  Cost floor;
};
CostPair FastestOf(int rounds, const std::function<Cost()>& subject,
                   const std::function<Cost()>& floor);

/// Ends the benchmark with a message.
[[noreturn]] void Fail(const std::string& message);

}  // namespace vela_bench

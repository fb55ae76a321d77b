// Runs programs and tells what they took.
#pragma once

#include <functional>
#include <string>
#include <vector>

namespace vela_bench {

/// What one run took.
struct Cost {
  double wallSeconds = 0;
  double cpuSeconds = 0;     ///< of user and system
  double peakMebibytes = 0;  ///< resident memory
};

/// Runs `command` (path first) with its output thrown away, and waits for it. Ends the benchmark
/// with a message when it does not exit with 0. `whileRunning`, when given, is called with its
/// process id every few milliseconds.
Cost TimedRun(const std::vector<std::string>& command,
              const std::function<void(int)>& whileRunning = nullptr);

/// Runs all subjects in turn, `rounds` times, and returns the least wall and processor time and the
/// highest memory of each: what other work on the machine adds falls on all, and only ever adds.
std::vector<Cost> LeastOf(int rounds, const std::vector<std::function<Cost()>>& subjects);

/// The same for a subject and its floor.
struct CostPair {
  Cost subject;
  Cost floor;
};
CostPair FastestOf(int rounds, const std::function<Cost()>& subject,
                   const std::function<Cost()>& floor);

/// Ends the benchmark with a message.
[[noreturn]] void Fail(const std::string& message);

}  // namespace vela_bench

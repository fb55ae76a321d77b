// Runs programs and measures their cost.
#pragma once

#include <functional>
#include <string>
#include <vector>

namespace vela_bench {

/// Cost of one run.
struct Cost {
  double wallSeconds = 0;
  double cpuSeconds = 0;     ///< user and system time
  double peakMebibytes = 0;  ///< resident memory
};

/// Runs `command` (path first), discards its output and waits for it. Ends the benchmark with a
/// message when the command does not exit with 0. `whileRunning`, if given, is called with the
/// process id every few milliseconds.
Cost TimedRun(const std::vector<std::string>& command,
              const std::function<void(int)>& whileRunning = nullptr);

/// Runs all subjects in turn, `rounds` times, and returns the lowest wall and processor time and
/// the highest memory of each. Other load on the machine then affects all subjects alike; it can
/// only add time.
std::vector<Cost> LeastOf(int rounds, const std::vector<std::function<Cost()>>& subjects);

/// The same for a subject and its floor.
struct CostPair {
  Cost subject;
  Cost floor;
};
CostPair FastestOf(int rounds, const std::function<Cost()>& subject,
                   const std::function<Cost()>& floor);

/// Prints a message to standard error and ends the benchmark with status 1.
[[noreturn]] void Fail(const std::string& message);

}  // namespace vela_bench

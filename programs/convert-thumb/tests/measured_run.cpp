#include "measured_run.h"

#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>

namespace vela_test {
namespace {

constexpr size_t kBytesPerUnit = 1024;

/// Passed from a child to its parent in shared memory.
struct Report {
  int exitCode;
  bool timedOut;
  long peakMemory;
  char error[1000];
};

void RunAndReport(const std::string& path, const std::vector<std::string>& arguments,
                  const ProgramOptions& options, Report& report) {
  const ProgramResult result = RunProgram(path, arguments, options);
  rusage usage = {};
  getrusage(RUSAGE_CHILDREN, &usage);
  report.exitCode = result.exitCode;
  report.timedOut = result.timedOut;
  report.peakMemory = usage.ru_maxrss;
  const size_t length = std::min(result.err.size(), sizeof report.error - 1);
  std::memcpy(report.error, result.err.data(), length);
}

}  // namespace

MeasuredRun RunMeasured(const std::string& path, const std::vector<std::string>& arguments,
                        const ProgramOptions& options) {
  void* const shared =
      mmap(nullptr, sizeof(Report), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  EXPECT_NE(shared, MAP_FAILED);
  auto& report = *static_cast<Report*>(shared);
  // In a separate process, which has no other children.
  const pid_t child = fork();
  if (child == 0) {
    RunAndReport(path, arguments, options, report);
    _exit(0);
  }
  int status = -1;
  waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
  const MeasuredRun run = {report.exitCode, report.timedOut,
                           static_cast<size_t>(report.peakMemory) * kBytesPerUnit, report.error};
  munmap(shared, sizeof(Report));
  return run;
}

}  // namespace vela_test

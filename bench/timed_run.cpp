#include "timed_run.h"

#include <errno.h>
#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>

namespace vela_bench {

namespace {

pid_t Start(const std::vector<std::string>& command) {
  std::vector<char*> arguments;
  arguments.reserve(command.size() + 1);
  for (const std::string& argument : command) {
    arguments.push_back(const_cast<char*>(argument.c_str()));
  }
  arguments.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
  pid_t child = 0;
  if (posix_spawn(&child, arguments[0], &actions, nullptr, arguments.data(), environ) != 0) {
    Fail("cannot start " + command[0]);
  }
  posix_spawn_file_actions_destroy(&actions);
  return child;
}

/// Returns the child's status; `usage` receives its resource usage.
int WaitFor(pid_t child, const std::function<void(int)>& whileRunning, rusage& usage) {
  int status = 0;
  if (!whileRunning) {
    wait4(child, &status, 0, &usage);
    return status;
  }
  while (wait4(child, &status, WNOHANG, &usage) == 0) {
    whileRunning(child);
    usleep(5000);
  }
  return status;
}

double Seconds(const timeval& time) {
  return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
}

void TakeLess(Cost& best, const Cost& cost) {
  best.wallSeconds = std::min(best.wallSeconds, cost.wallSeconds);
  best.cpuSeconds = std::min(best.cpuSeconds, cost.cpuSeconds);
  best.peakMebibytes = std::max(best.peakMebibytes, cost.peakMebibytes);
}

}  // namespace

Cost TimedRun(const std::vector<std::string>& command,
              const std::function<void(int)>& whileRunning) {
  const auto begin = std::chrono::steady_clock::now();
  const pid_t child = Start(command);
  rusage usage = {};
  const int status = WaitFor(child, whileRunning, usage);
  const std::chrono::duration<double> wall = std::chrono::steady_clock::now() - begin;
  if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) {
    Fail(command[0] + " ended with status " + std::to_string(status));
  }
  return {wall.count(), Seconds(usage.ru_utime) + Seconds(usage.ru_stime),
          static_cast<double>(usage.ru_maxrss) / 1024};
}

std::vector<Cost> LeastOf(int rounds, const std::vector<std::function<Cost()>>& subjects) {
  std::vector<Cost> best;
  for (const std::function<Cost()>& subject : subjects) {
    best.push_back(subject());
  }
  for (int round = 1; round < rounds; ++round) {
    for (size_t i = 0; i < subjects.size(); ++i) {
      TakeLess(best[i], subjects[i]());
    }
  }
  return best;
}

CostPair FastestOf(int rounds, const std::function<Cost()>& subject,
                   const std::function<Cost()>& floor) {
  const std::vector<Cost> best = LeastOf(rounds, {floor, subject});
  return {best[1], best[0]};
}

void Fail(const std::string& message) {
  std::fprintf(stderr, "%s: %s\n", program_invocation_short_name, message.c_str());
  std::exit(1);
}

}  // namespace vela_bench

#include "timed_run.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

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

int WaitFor(pid_t child, const std::function<void(int)>& whileRunning) {
  int status = 0;
  if (!whileRunning) {
    waitpid(child, &status, 0);
    return status;
  }
  while (waitpid(child, &status, WNOHANG) == 0) {
    whileRunning(child);
    usleep(5000);
  }
  return status;
}

}  // namespace

Cost TimedRun(const std::vector<std::string>& command,
              const std::function<void(int)>& whileRunning) {
  const auto begin = std::chrono::steady_clock::now();
  const pid_t child = Start(command);
  const int status = WaitFor(child, whileRunning);
  const std::chrono::duration<double> wall = std::chrono::steady_clock::now() - begin;
  if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) {
    Fail(command[0] + " ended with status " + std::to_string(status));
  }
  return {wall.count()};
}

CostPair FastestOf(int rounds, const std::function<Cost()>& subject,
                   const std::function<Cost()>& floor) {
  CostPair best;
  for (int round = 0; round < rounds; ++round) {
    const Cost floorCost = floor();
    const Cost subjectCost = subject();
    if (round == 0 || subjectCost.wallSeconds < best.subject.wallSeconds) {
      best.subject = subjectCost;
    }
    if (round == 0 || floorCost.wallSeconds < best.floor.wallSeconds) {
      best.floor = floorCost;
    }
  }
  return best;
}

void Fail(const std::string& message) {
  std::fprintf(stderr, "velathumb_bench: %s\n", message.c_str());
  std::exit(1);
}

}  // namespace vela_bench

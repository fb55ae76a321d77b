// A machine on which all programs run.
#pragma once

#include <sys/types.h>

#include <optional>
#include <string>
#include <vector>

#include "support/program.h"

namespace vela_test {

constexpr const char* kProfileFile = "/tmp/profiles.conf";

/// The index daemon and the queue runner, which tests start and kill, and the velathumb processes
/// of the runner. All six thumbnail classes are made, in three phases.
class Machine {
 public:
  Machine();

  /// Starts the daemon and waits until it answers.
  void StartDaemon();
  /// Makes it reload its settings.
  void ReloadDaemon();
  /// Kills it with SIGKILL and restarts it, without waiting for it.
  void KillAndRestartDaemon();
  /// Ends it with SIGTERM; returns its result.
  std::optional<ProgramResult> StopDaemon();

  /// Starts a runner that keeps running, with two jobs at a time.
  void StartFollowingRunner();
  void KillRunner();

  /// Kills one velathumb with SIGKILL; returns whether there was one.
  static bool KillVelathumb();
  static std::vector<pid_t> Velathumbs();

  /// Starts a runner that ends when the queue is empty.
  static Program StartRunner(const std::vector<std::string>& more = {});

  /// Runs a runner until the queue is empty, one job at a time.
  static ProgramResult RunRunner(const std::vector<std::string>& more = {});

  /// Whether anything is left in the files of the photo queue.
  static bool HasQueue();

 private:
  std::optional<Program> daemon_;
  std::optional<Program> runner_;
};

}  // namespace vela_test

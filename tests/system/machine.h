// A machine on which all programs run.
#pragma once

#include <sys/types.h>

#include <optional>
#include <string>
#include <vector>

#include "support/program.h"

namespace vela_test {

constexpr const char* kProfileFile = "/tmp/profiles.conf";

/// The index daemon and the queue runner, started and killed as a test wants, with the velathumbs
/// that the runner starts. All six thumbnail classes are made, in three phases.
class Machine {
 public:
  Machine();

  /// Starts the daemon and waits until it answers.
  void StartDaemon();
  /// Has it read its settings anew.
  void ReloadDaemon();
  /// Starts it anew after kill -9, without waiting for it.
  void KillDaemonAndStartAnew();
  /// Ends it with SIGTERM; its result.
  std::optional<ProgramResult> StopDaemon();

  /// Starts a runner that stays, two jobs at a time.
  void StartFollowingRunner();
  void KillRunner();

  /// Kills one velathumb with kill -9; whether there was one.
  static bool KillVelathumb();
  static std::vector<pid_t> Velathumbs();

  /// Runs a runner until nothing waits, one job at a time.
  static ProgramResult RunRunner(const std::vector<std::string>& more = {});

  /// Whether anything is left in the files of the photo queue.
  static bool HasQueue();

 private:
  std::optional<Program> daemon_;
  std::optional<Program> runner_;
};

}  // namespace vela_test

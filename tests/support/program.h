// Runs programs as real child processes, in the environment that a test wants.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace vela_test {

/// How a program ended.
struct ProgramResult {
  int exitCode = -1;      ///< -1 when a signal ended it or it could not be started
  int signal = 0;         ///< the signal that ended it, 0 for a normal exit
  int startError = 0;     ///< errno when the program could not be started
  bool timedOut = false;  ///< RunProgram only: killed at its time limit
  std::string out;        ///< standard output
  std::string err;        ///< standard error
  std::chrono::nanoseconds wallTime{0};
};

/// A step of the child between fork and exec: only async-signal-safe calls; a result other than 0
/// is an errno and prevents the program from starting.
using BeforeExec = std::function<int()>;

/// The environment of a program.
struct ProgramOptions {
  std::optional<mode_t> umask;                          ///< inherited when not set
  std::string workingDirectory;                         ///< inherited when empty
  std::optional<std::vector<std::string>> environment;  ///< whole, "NAME=value"; else inherited
  std::vector<std::string> addedEnvironment;    ///< "NAME=value", replaces what is inherited
  std::optional<std::string> argumentZero;      ///< the path when not set
  std::string input;                            ///< standard input; /dev/null when empty
  std::vector<int> keptDescriptors;             ///< descriptors the child gets, same numbers
  bool closeInput = false;                      ///< start with descriptor 0 closed
  bool closeOutput = false;                     ///< start with descriptor 1 closed
  bool closeError = false;                      ///< start with descriptor 2 closed
  std::vector<BeforeExec> beforeExec;           ///< run in order, last before exec
  std::chrono::milliseconds timeLimit{120000};  ///< RunProgram kills it then
};

/// A running program; killed and reaped when the object ends before it.
class Program {
 public:
  Program(Program&&) noexcept;
  Program& operator=(Program&&) noexcept;
  ~Program();

  pid_t Pid() const;

  /// Sends a signal; does nothing when the program has ended.
  void Kill(int signal) const;

  /// Waits at most `limit` for the end; empty when it still runs. Later calls give the same result.
  std::optional<ProgramResult> Wait(
      std::chrono::milliseconds limit = std::chrono::milliseconds(120000));

  /// Standard output / standard error so far.
  std::string Output() const;
  std::string Error() const;

 private:
  friend Program StartProgram(const std::string&, const std::vector<std::string>&,
                              const ProgramOptions&);
  struct State;
  explicit Program(std::unique_ptr<State> state);
  std::unique_ptr<State> state_;
};

/// Starts `path` (no search, no shell) with `arguments` after argument zero. A program that cannot
/// be started has ended already, with `startError` in its result.
Program StartProgram(const std::string& path, const std::vector<std::string>& arguments,
                     const ProgramOptions& options = ProgramOptions());

/// Starts the program and waits for its end.
ProgramResult RunProgram(const std::string& path, const std::vector<std::string>& arguments,
                         const ProgramOptions& options = ProgramOptions());

/// Removes all capabilities from the program and its children, so that permission bits apply to it
/// although it runs as user 0.
BeforeExec DropCapabilities();

/// Sets a resource limit (RLIMIT_FSIZE, RLIMIT_NOFILE, ...), soft and hard.
BeforeExec LimitResource(int resource, uint64_t value);

/// Starts the program with the signal ignored.
BeforeExec IgnoreSignal(int signal);

/// Starts the program with the signal blocked.
BeforeExec BlockSignal(int signal);

}  // namespace vela_test

// Makes one system call of a program, or of a tool that it starts, fail, or kills the program
// there. Every call is announced by the kernel before it is made, so each can be hit exactly.
#pragma once

#include <sys/types.h>

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "support/program.h"
#include "support/watched_calls.h"

namespace vela_test {

/// Whose calls are counted.
enum class CallScope {
  kProgram,  ///< the program's own
  kTools     ///< those of all processes that it has started, before and after they become tools
};

/// A call that a program has made.
struct MadeCall {
  const WatchedCall* call;
  std::string object;  ///< the path, or what its descriptor refers to
};

/// What happens to the call with the number `at`, counted from 0 within the scope.
struct CallFault {
  size_t at = 0;
  int error = 0;      ///< errno or kShortTransfer
  bool kill = false;  ///< instead, the process that makes the call is killed
};

/// Watches one run of a program. Calls for what belongs to the system (libraries, programs, /proc)
/// are not counted.
class CallFaults {
 public:
  /// Without a fault, only counts.
  CallFaults(CallScope scope, const std::optional<CallFault>& fault);
  /// Waits for the end of everything that the program has started; a minute at most.
  ~CallFaults();
  CallFaults(const CallFaults&) = delete;
  CallFaults& operator=(const CallFaults&) = delete;

  /// The last of the steps before exec.
  BeforeExec Step() const;

  /// Waits until the program and everything that it has started have ended; returns whether they
  /// have in time. Then the calls are complete.
  bool WaitForEnd(int milliseconds);
  const std::vector<MadeCall>& Calls() const;

  /// Whether the fault has occurred.
  bool HasStruck() const;

 private:
  class Supervisor;
  std::unique_ptr<Supervisor> supervisor_;
};

}  // namespace vela_test

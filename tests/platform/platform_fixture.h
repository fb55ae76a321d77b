// Shared by the platform's tests: calls in separate processes and threads, and checks around them.
#pragma once

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <sys/types.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace vela_test {

using Strings = std::vector<std::string>;

/// Starts a copy of this process that makes the call and exits with its result (0 to 255). The call
/// runs without any of the test's other threads.
pid_t Fork(const std::function<int()>& call);

/// Waits for a process started by Fork. Returns its exit status, or minus the signal that ended it.
int Join(pid_t pid);

/// Fork and Join.
int RunForked(const std::function<int()>& call);

/// RunForked with a time limit in seconds, after which the process is killed.
int RunWithin(int seconds, const std::function<int()>& call);

/// RunForked with a signal handler that interrupts the call every 2 ms.
int RunInterrupted(const std::function<int()>& call);

/// Makes the calls, which may contain expectations, in a separate process.
void InOwnProcess(const std::function<void()>& calls);

/// Like InOwnProcess; returns the standard error of the calls.
std::string PrintedBy(const std::function<void()>& calls);

/// Makes the call in a separate process while this one holds an exclusive lock on the file. Runs
/// `meanwhile` once the call has had time to block, then releases the lock. Returns the call's
/// result.
int RunAgainstLock(const std::string& file, const std::function<int()>& call,
                   const std::function<void()>& meanwhile);

/// Makes the call in `count` threads at once, with the thread's number (from 0), and joins them.
void RunInThreads(int count, const std::function<void(int)>& call);

/// Waits up to 5 seconds for the condition; returns whether it has become true.
bool WaitUntil(const std::function<bool()>& condition);

/// Waits up to 5 seconds for the process to disappear; returns whether it has.
bool WaitUntilEnded(pid_t pid);

/// Returns how many terminated children of this process have not been waited for.
int CountZombies();

/// Fails the test if this process has more or fewer open descriptors after the calls than before.
void ExpectNoDescriptorLeak(const std::function<void()>& calls);

/// Measures the time since its construction.
class Stopwatch {
 public:
  double Seconds() const;
  /// Fails the test unless the time is in this range, in seconds.
  void ExpectBetween(double atLeast, double lessThan) const;

 private:
  std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
};

}  // namespace vela_test

// The set-up of this process, and the state of others.
#pragma once

#include <sys/types.h>

#include <cstdint>
#include <initializer_list>
#include <optional>
#include <vector>

namespace vela {

/// The state of the process with a given id.
enum class ProcessState {
  kRunning,
  kInaccessible,  ///< the process exists, but this one may not signal it
  kGone,
};

/// Returns the state of the process `pid`, kGone for a number that no process can have.
ProcessState StateOfProcess(long pid);

/// Identifies a process for good: its id may be used again.
struct ProcessIdentity {
  pid_t pid = 0;
  uint64_t startTime = 0;  ///< clock ticks since the start of the system
};

constexpr bool operator<(const ProcessIdentity& a, const ProcessIdentity& b) {
  return a.pid != b.pid ? a.pid < b.pid : a.startTime < b.startTime;
}

/// What a process and its descendants have done until now.
struct ProcessActivity {
  bool isRunning = false;  ///< one of them is running, or waits only for a processor
  uint64_t cpuTime = 0;    ///< clock ticks; includes children that have ended
  uint64_t written = 0;    ///< bytes passed to write calls; 0 when that cannot be read
  std::vector<ProcessIdentity> descendants;  ///< those that have not ended
};

/// Returns the activity of the process `pid`, nothing when it does not exist or cannot be examined.
std::optional<ProcessActivity> ActivityOf(pid_t pid);

/// Opens /dev/null for each standard descriptor that is closed, so that no file opened later gets
/// its number.
void ReserveStandardDescriptors();

/// From now on the umask does not reduce the modes of new files.
void CreateFilesWithExactModes();

/// Raises the limit of open files to `wanted`, as far as permitted. Returns the resulting limit,
/// `wanted` when it is unknown.
uint64_t RaiseOpenFileLimit(uint64_t wanted);

/// Blocks the signals in the calling thread and in all threads that it starts.
void BlockSignals(std::initializer_list<int> signals);

/// Makes a write to a closed pipe or socket fail instead of ending the process.
void IgnoreBrokenPipes();

}  // namespace vela

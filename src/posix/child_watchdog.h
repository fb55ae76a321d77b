// The time limit of a child whose output is read with blocking calls.
#pragma once

#include <chrono>
#include <condition_variable>
#include <mutex>
#include <string>
#include <thread>

#include "posix/child_process.h"

namespace vela {

/// Kills a child at its time limit, from a separate thread.
class ChildWatchdog {
 public:
  ChildWatchdog() = default;
  ChildWatchdog(const ChildWatchdog&) = delete;
  ChildWatchdog& operator=(const ChildWatchdog&) = delete;
  ~ChildWatchdog() { Stop(); }

  /// Starts watching the child `pid`; `program` is its name in log messages. `connection` is a
  /// socket from which its output is read: reading ends at the time limit also when another process
  /// has the other end. It must stay open until Stop. Returns false when no thread can be started.
  bool Start(pid_t pid, const char* program, std::chrono::seconds limit, int connection);

  /// Stops watching. Must be called before the child is reaped: until then its process id is not
  /// reused.
  void Stop();

 private:
  void Watch(pid_t pid, const std::string& program, std::chrono::seconds limit, int connection);

  std::mutex mutex_;
  std::condition_variable wakeUp_;
  bool isStopped_ = false;
  std::thread thread_;
};

}  // namespace vela

#include "posix/child_watchdog.h"

#include <sys/socket.h>

#include <system_error>

#include "posix/child_process.h"
#include "posix/deadline.h"
#include "posix/signal_block.h"

namespace vela {

bool ChildWatchdog::Start(pid_t pid, const char* program, std::chrono::seconds limit,
                          int connection) {
  // The thread inherits the block, so signals are delivered to the program's other threads.
  const SignalBlock noSignals;
  try {
    thread_ =
        std::thread(&ChildWatchdog::Watch, this, pid, std::string(program), limit, connection);
    return true;
  } catch (const std::system_error&) {
    return false;
  }
}

void ChildWatchdog::Stop() {
  if (!thread_.joinable()) {
    return;
  }
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    isStopped_ = true;
  }
  wakeUp_.notify_one();
  thread_.join();
}

void ChildWatchdog::Watch(pid_t pid, const std::string& program, std::chrono::seconds limit,
                          int connection) {
  const Deadline deadline(limit);
  std::unique_lock<std::mutex> lock(mutex_);
  const bool isStopped = wakeUp_.wait_until(lock, deadline.End(), [this] { return isStopped_; });
  if (!isStopped) {
    KillOverdueChild(pid, program.c_str(), limit);
    shutdown(connection, SHUT_RDWR);
  }
}

}  // namespace vela

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstring>
#include <memory>
#include <mutex>
#include <utility>
#include <vector>

#include "platform/standalone/last_error.h"
#include "platform/standalone/settings.h"
#include "platform/standalone/tool_confinement.h"
#include "platform/vlibc.h"
#include "posix/child_process.h"
#include "posix/child_watchdog.h"
#include "posix/file_descriptor.h"

namespace {

using vela::ChildWatchdog;
using vela::FileDescriptor;

/// A child and the stream of its output.
struct PipedChild {
  FILE* stream = nullptr;
  FileDescriptor connection;  ///< that of the stream, once more
  pid_t pid = -1;
  std::unique_ptr<ChildWatchdog> watchdog;
};

/// All children whose streams are open.
class PipedChildren {
 public:
  void Add(PipedChild child) {
    const std::lock_guard<std::mutex> lock(mutex_);
    children_.push_back(std::move(child));
  }

  /// Removes and returns the child of `stream`; an empty one when there is none.
  PipedChild Take(const FILE* stream) {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto found = std::find_if(children_.begin(), children_.end(),
                                    [&](const auto& child) { return child.stream == stream; });
    if (found == children_.end()) {
      return {};
    }
    PipedChild child = std::move(*found);
    children_.erase(found);
    return child;
  }

 private:
  std::mutex mutex_;
  std::vector<PipedChild> children_;
};

/// Never destroyed, because a stream may still be open when the program ends.
PipedChildren& OpenChildren() {
  static auto* children = new PipedChildren;
  return *children;
}

/// Kills a child that is not returned to the caller.
void Discard(PipedChild& child) {
  kill(child.pid, SIGKILL);
  vela::ReapChild(child.pid);
}

/// Returns 0 or an errno value.
int Watch(PipedChild& child, const char* program) {
  const std::chrono::seconds limit = vela::CurrentSettings().toolTimeout;
  if (limit.count() == 0) {
    return 0;
  }
  child.watchdog = std::make_unique<ChildWatchdog>();
  return child.watchdog->Start(child.pid, program, limit, child.connection.Get()) ? 0 : EAGAIN;
}

/// Starts the program with its output in a socket. Unlike a pipe, a socket cannot be opened under
/// /proc by other processes of the child's user, and reading from it can be ended. Returns 0 or an
/// errno value.
int Open(const char* program, std::vector<char*>& arguments, bool joinError, PipedChild& child) {
  int ends[2];
  if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) {
    return errno;
  }
  FileDescriptor readEnd(ends[0]);
  FileDescriptor writeEnd(ends[1]);
  child.connection.Reset(fcntl(readEnd.Get(), F_DUPFD_CLOEXEC, 0));
  if (!child.connection.IsOpen()) {
    return errno;
  }
  const vela::ChildStreams streams{writeEnd.Get(), joinError ? writeEnd.Get() : -1};
  const vela::Confinement confinement =
      vela::ConfinementOfTool(program, arguments.data(), vela::CurrentSettings().toolTimeout);
  int error = vela::StartChild(program, arguments.data(), streams, confinement, child.pid);
  if (error != 0) {
    return error;
  }
  writeEnd.Reset();

  error = Watch(child, program);
  if (error == 0) {
    child.stream = fdopen(readEnd.Get(), "r");
    if (child.stream == nullptr) {
      error = errno;
    }
  }
  if (error != 0) {
    child.watchdog.reset();
    Discard(child);
    return error;
  }
  readEnd.Release();
  return 0;
}

}  // namespace

FILE* VLIBCPopen(const char* program, const char* mode, ...) {
  if (program == nullptr || mode == nullptr || mode[0] != 'r') {
    vela::SetLastError(EINVAL);
    return nullptr;
  }
  std::vector<char*> arguments{const_cast<char*>(program)};
  va_list list;
  va_start(list, mode);
  while (char* argument = va_arg(list, char*)) {
    arguments.push_back(argument);
  }
  va_end(list);
  arguments.push_back(nullptr);

  PipedChild child;
  const bool joinError = strchr(mode + 1, 'E') != nullptr;
  const int error = Open(program, arguments, joinError, child);
  if (error != 0) {
    vela::SetLastError(error);
    return nullptr;
  }
  FILE* stream = child.stream;
  OpenChildren().Add(std::move(child));
  return stream;
}

int VLIBCPclose(FILE* stream) {
  const PipedChild child = OpenChildren().Take(stream);
  if (stream == nullptr || child.stream == nullptr) {
    return vela::Fail(EINVAL);
  }
  // A child that is still writing gets SIGPIPE. One that ignores it runs to its end or its time
  // limit.
  shutdown(child.connection.Get(), SHUT_RDWR);
  fclose(stream);
  vela::AwaitChild(child.pid);
  if (child.watchdog) {
    child.watchdog->Stop();
  }
  vela::KillGroup(child.pid);
  const int status = vela::ReapChild(child.pid);
  if (status == -1) {
    return vela::Fail(ECHILD);
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : vela::Fail(EINTR);
}

#include "encoding/unfinished_outputs.h"

#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <cstring>

namespace vela {

namespace {

constexpr int kFailed = 1;

/// A list that a signal handler can read at any moment: nothing is ever taken off it.
struct NotedOutput {
  explicit NotedOutput(const std::string& name) : path(name) {}

  const std::string path;
  std::atomic<bool> isForgotten{false};
  NotedOutput* next = nullptr;
};
std::atomic<NotedOutput*> g_noted{nullptr};
static_assert(std::atomic<NotedOutput*>::is_always_lock_free);
std::atomic<bool> g_isEnding{false};
static_assert(std::atomic<bool>::is_always_lock_free);

struct FatalSignal {
  int number;
  const char* message;
};
constexpr FatalSignal kFatalSignals[] = {
    {SIGABRT, "convert-thumb: a library gave up, most likely for want of memory\n"},
    {SIGTRAP, "convert-thumb: a library gave up, most likely for want of memory\n"},
    {SIGBUS, "convert-thumb: the photo changed while it was read\n"},
    {SIGXCPU, "convert-thumb: the photo takes too much processor time\n"},
};

void Tell(const char* message) {
  const ssize_t written = write(STDERR_FILENO, message, std::strlen(message));
  static_cast<void>(written);  // nobody else could be told
}

/// A device keeps nothing of the run.
bool IsRegularFile(const std::string& path) {
  struct stat status;
  return stat(path.c_str(), &status) == 0 && S_ISREG(status.st_mode);
}

void EndCleanly(int number) {
  RemoveNotedOutputs();
  for (const FatalSignal& fatal : kFatalSignals) {
    if (fatal.number == number) {
      Tell(fatal.message);
    }
  }
  // Another thread may have been about to make one.
  RemoveNotedOutputs();
  _exit(kFailed);
}

}  // namespace

bool NoteOutput(const std::string& path) {
  auto* const noted = new NotedOutput(path);
  noted->next = g_noted;
  while (!g_noted.compare_exchange_weak(noted->next, noted)) {
  }
  // Only now: either this sees that the run is ending, or who removes the files sees this one.
  return !g_isEnding;
}

void ForgetOutput(const std::string& path) {
  for (NotedOutput* noted = g_noted; noted != nullptr; noted = noted->next) {
    if (!noted->isForgotten && noted->path == path) {
      noted->isForgotten = true;
      return;
    }
  }
}

void RemoveNotedOutputs() {
  g_isEnding = true;
  for (const NotedOutput* noted = g_noted; noted != nullptr; noted = noted->next) {
    if (!noted->isForgotten && IsRegularFile(noted->path)) {
      unlink(noted->path.c_str());
    }
  }
}

void EndCleanlyOnFatalSignals() {
  struct sigaction action = {};
  action.sa_handler = EndCleanly;
  sigfillset(&action.sa_mask);
  for (const FatalSignal& fatal : kFatalSignals) {
    sigaction(fatal.number, &action, nullptr);
  }
}

}  // namespace vela

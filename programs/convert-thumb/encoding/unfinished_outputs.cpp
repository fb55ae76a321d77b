#include "encoding/unfinished_outputs.h"

#include <unistd.h>

#include <atomic>
#include <csignal>
#include <cstring>

namespace {

constexpr int kFailed = 1;

/// A list that a signal handler can read at any moment: nothing is ever taken off it.
struct NotedOutput {
  std::string path;
  NotedOutput* next = nullptr;
};
std::atomic<NotedOutput*> g_noted{nullptr};
static_assert(std::atomic<NotedOutput*>::is_always_lock_free);

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

void EndCleanly(int number) {
  RemoveNotedOutputs();
  for (const FatalSignal& fatal : kFatalSignals) {
    if (fatal.number == number) {
      Tell(fatal.message);
    }
  }
  _exit(kFailed);
}

}  // namespace

void NoteOutput(const std::string& path) {
  auto* const noted = new NotedOutput{path, g_noted.load()};
  while (!g_noted.compare_exchange_weak(noted->next, noted)) {
  }
}

void RemoveNotedOutputs() {
  for (const NotedOutput* noted = g_noted; noted != nullptr; noted = noted->next) {
    unlink(noted->path.c_str());
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

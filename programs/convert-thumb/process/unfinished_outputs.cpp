#include "process/unfinished_outputs.h"

#include <unistd.h>

#include <atomic>
#include <csignal>
#include <cstring>

#include "process/source_file.h"

namespace vela {

namespace {

constexpr int kFailed = 1;

/// An entry of a list that a signal handler can read at any time: entries are never removed.
struct RegisteredOutput {
  explicit RegisteredOutput(const std::string& name) : path(name) {}

  const std::string path;
  std::atomic<bool> isDropped{false};
  RegisteredOutput* next = nullptr;
};
std::atomic<RegisteredOutput*> g_outputs{nullptr};
static_assert(std::atomic<RegisteredOutput*>::is_always_lock_free);
std::atomic<bool> g_isEnding{false};
static_assert(std::atomic<bool>::is_always_lock_free);

struct FatalSignal {
  int number;
  const char* message;
};
constexpr FatalSignal kFatalSignals[] = {
    {SIGABRT, "convert-thumb: a library aborted, probably because it ran out of memory\n"},
    {SIGTRAP, "convert-thumb: a library aborted, probably because it ran out of memory\n"},
    {SIGBUS, "convert-thumb: the photo changed while it was being read\n"},
    {SIGXCPU, "convert-thumb: the photo takes too much processor time\n"},
};

void Print(const char* message) {
  const ssize_t written = write(STDERR_FILENO, message, std::strlen(message));
  static_cast<void>(written);  // there is no other place to report it
}

void EndOnSignal(int number) {
  RemoveRegisteredOutputs();
  for (const FatalSignal& fatal : kFatalSignals) {
    if (fatal.number == number) {
      Print(fatal.message);
    }
  }
  // Another thread may have been about to create one.
  RemoveRegisteredOutputs();
  _exit(kFailed);
}

}  // namespace

bool RegisterOutput(const std::string& path) {
  auto* const output = new RegisteredOutput(path);
  output->next = g_outputs;
  while (!g_outputs.compare_exchange_weak(output->next, output)) {
  }
  // Checked after the registration: either this call sees that the run is ending, or the removal
  // sees the new entry.
  return !g_isEnding;
}

void UnregisterOutput(const std::string& path) {
  for (RegisteredOutput* output = g_outputs; output != nullptr; output = output->next) {
    if (!output->isDropped && output->path == path) {
      output->isDropped = true;
      return;
    }
  }
}

void RemoveRegisteredOutputs() {
  g_isEnding = true;
  for (const RegisteredOutput* output = g_outputs; output != nullptr; output = output->next) {
    // Devices are kept.
    if (!output->isDropped && TypeOf(output->path) == FileType::kRegular) {
      unlink(output->path.c_str());
    }
  }
}

void CleanUpOnFatalSignals() {
  struct sigaction action = {};
  action.sa_handler = EndOnSignal;
  sigfillset(&action.sa_mask);
  for (const FatalSignal& fatal : kFatalSignals) {
    sigaction(fatal.number, &action, nullptr);
  }
}

}  // namespace vela

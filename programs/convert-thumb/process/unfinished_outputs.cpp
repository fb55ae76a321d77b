#include "process/unfinished_outputs.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <ctime>
#include <memory>

#include "posix/signal_block.h"
#include "process/failure_report.h"

namespace vela {

namespace {

constexpr int kFailed = 1;

/// An entry of a list that a signal handler can read at any time: entries are never removed.
struct Output {
  FileDescriptor directory;
  std::string name;
  /// Keeps the number of the file from being used again.
  FileDescriptor file;
  struct stat status = {};
  Output* next = nullptr;
};
std::atomic<Output*> g_outputs{nullptr};
static_assert(std::atomic<Output*>::is_always_lock_free);
std::atomic<bool> g_isEnding{false};
static_assert(std::atomic<bool>::is_always_lock_free);
/// Files that may exist already but are not in the list yet.
std::atomic<int> g_beingCreated{0};
static_assert(std::atomic<int>::is_always_lock_free);

struct FatalSignal {
  int number;
  const char* message;
};
constexpr FatalSignal kFatalSignals[] = {
    {SIGABRT, "a library aborted, probably because it ran out of memory"},
    {SIGTRAP, "a library aborted, probably because it ran out of memory"},
    {SIGBUS, "the photo changed while it was being read"},
    {SIGXCPU, "the photo takes too much processor time"},
#if !defined(VELA_SANITIZED)  // a sanitizer reports these itself
    {SIGSEGV, "a library crashed on this photo"},
    {SIGFPE, "a library crashed on this photo"},
    {SIGILL, "a library crashed on this photo"},
#endif
};

/// For a handler that runs because the stack is full: several times of what it needs.
constexpr size_t kHandlerStackSize = size_t{64} << 10;

bool IsSameFile(const struct stat& a, const struct stat& b) {
  return a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

/// The name is examined and removed in two steps, but whoever can exchange the file in between can
/// also remove it.
void Remove(const Output& output) {
  struct stat present;
  if (fstatat(output.directory.Get(), output.name.c_str(), &present, AT_SYMLINK_NOFOLLOW) == 0 &&
      IsSameFile(present, output.status)) {
    unlinkat(output.directory.Get(), output.name.c_str(), 0);
  }
}

void AddToList(Output* output) {
  output->next = g_outputs;
  while (!g_outputs.compare_exchange_weak(output->next, output)) {
  }
}

/// Other threads may be about to add a file. The wait is limited in case that file system hangs.
void WaitForNewOutputs() {
  constexpr timespec kMillisecond = {0, 1000000};
  constexpr int kMostWaits = 1000;
  for (int waits = 0; g_beingCreated > 0 && waits < kMostWaits; ++waits) {
    nanosleep(&kMillisecond, nullptr);
  }
}

void EndOnSignal(int number) {
  RemoveOutputs();
  for (const FatalSignal& fatal : kFatalSignals) {
    if (fatal.number == number) {
      PrintFailureNow(fatal.message);
    }
  }
  _exit(kFailed);
}

/// The stack of the calling thread can be full. In other threads a full stack ends the process at
/// once.
void UseHandlerStack() {
  static char memory[kHandlerStackSize];
  stack_t stack = {};
  stack.ss_sp = memory;
  stack.ss_size = sizeof memory;
  sigaltstack(&stack, nullptr);
}

/// Creates the file of an output whose directory and name are set.
FileDescriptor Create(Output& output, unsigned mode) {
  if (g_isEnding) {
    errno = ECANCELED;
    return {};
  }
  FileDescriptor file(openat(output.directory.Get(), output.name.c_str(),
                             O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, mode));
  if (file.IsOpen()) {
    output.file.Reset(fcntl(file.Get(), F_DUPFD_CLOEXEC, 0));
  }
  return file;
}

}  // namespace

FileDescriptor CreateOutput(const FileDescriptor& directory, const std::string& name,
                            unsigned mode) {
  auto output = std::make_unique<Output>();
  output->directory.Reset(fcntl(directory.Get(), F_DUPFD_CLOEXEC, 0));
  output->name = name;
  // A handler in this thread would wait for this function.
  const SignalBlock block;
  // Counted before the check: either this call sees that the run is ending, or the removal waits.
  ++g_beingCreated;
  FileDescriptor file = Create(*output, mode);
  if (file.IsOpen() && fstat(file.Get(), &output->status) == 0) {
    AddToList(output.release());
  }
  --g_beingCreated;
  return file;
}

void RemoveOutput(const FileDescriptor& output) {
  struct stat status;
  if (fstat(output.Get(), &status) != 0) {
    return;
  }
  for (const Output* entry = g_outputs; entry != nullptr; entry = entry->next) {
    if (IsSameFile(entry->status, status)) {
      Remove(*entry);
    }
  }
}

bool SyncOutputs() {
  // Lets the disk work on all of them at the same time.
  for (const Output* output = g_outputs; output != nullptr; output = output->next) {
    sync_file_range(output->file.Get(), 0, 0, SYNC_FILE_RANGE_WRITE);
  }
  for (const Output* output = g_outputs; output != nullptr; output = output->next) {
    if (fdatasync(output->file.Get()) != 0) {
      ReportFailure("cannot write %s: %s", output->name.c_str(), std::strerror(errno));
      return false;
    }
  }
  return true;
}

void RemoveOutputs() {
  g_isEnding = true;
  WaitForNewOutputs();
  for (const Output* output = g_outputs; output != nullptr; output = output->next) {
    Remove(*output);
  }
}

void CleanUpOnFatalSignals() {
  UseHandlerStack();
  struct sigaction action = {};
  action.sa_handler = EndOnSignal;
  action.sa_flags = SA_ONSTACK;
  sigfillset(&action.sa_mask);
  for (const FatalSignal& fatal : kFatalSignals) {
    sigaction(fatal.number, &action, nullptr);
  }
}

}  // namespace vela

// A runner that is killed before or after any of its system calls loses no entry.
#include <signal.h>
#include <sys/mman.h>
#include <sys/ptrace.h>
#include <sys/wait.h>
#include <unistd.h>

#include <set>

#include "platform/velaindex.h"
#include "queue_fixture.h"
#include "taken_queue.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

/// Numbers that a process shares with its children.
class SharedFlags {
 public:
  SharedFlags()
      : flags_(static_cast<volatile char*>(
            mmap(nullptr, kSize, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0))) {}
  ~SharedFlags() { munmap(const_cast<char*>(flags_), kSize); }
  SharedFlags(const SharedFlags&) = delete;
  SharedFlags& operator=(const SharedFlags&) = delete;

  volatile char& operator[](char entry) { return flags_[static_cast<unsigned char>(entry)]; }

 private:
  static constexpr size_t kSize = 256;
  volatile char* flags_;
};

/// One run, without velathumb: processes a and b, for b something new is queued, and defers c.
void ProcessQueue(SharedFlags& processed) {
  TakenQueue taken(PhotoQueuePaths());
  taken.RequeueDeferred();
  if (taken.Take() == TakenQueue::Outcome::kNothing) {
    return;
  }
  processed['a'] = 1;
  taken.MarkDone("/a");
  WriteIndexQueue("/n", kQueueFile);
  processed['b'] = 1;
  taken.MarkDone("/b");
  taken.AddToQueue({"/t"});
  taken.MarkDone("/t");
  taken.Defer({"/c"});
  taken.Finish();
  taken.RequeueDeferred();
}

/// Runs ProcessQueue in a process that is killed at the stop with this number: one before and one
/// after each system call. Returns whether it was.
bool KillAtStop(int last, SharedFlags& processed) {
  const pid_t child = fork();
  if (child == 0) {
    ptrace(PTRACE_TRACEME, 0, nullptr, nullptr);
    raise(SIGSTOP);
    ProcessQueue(processed);
    _exit(0);
  }
  int status = 0;
  for (int stop = 0; waitpid(child, &status, 0) == child && WIFSTOPPED(status); ++stop) {
    if (stop == last) {
      kill(child, SIGKILL);
    }
    ptrace(PTRACE_SYSCALL, child, nullptr, nullptr);
  }
  EXPECT_TRUE(WIFSIGNALED(status) || WEXITSTATUS(status) == 0);
  return WIFSIGNALED(status);
}

/// What the next runs find, until the queue is empty.
std::set<std::string> TakeAll() {
  std::set<std::string> entries;
  TakenQueue taken(PhotoQueuePaths());
  EXPECT_EQ(taken.RequeueDeferred(), 0);
  for (;;) {
    const TakenQueue::Outcome outcome = taken.Take();
    if (outcome != TakenQueue::Outcome::kTaken && outcome != TakenQueue::Outcome::kResumed) {
      // When the writer was killed before its first line, it counts as still at work.
      if (outcome == TakenQueue::Outcome::kBusy) {
        EXPECT_EQ(ReadFile(kQueueFile), "");
      } else {
        EXPECT_EQ(outcome, TakenQueue::Outcome::kNothing);
      }
      return entries;
    }
    for (const std::string& entry : taken.Entries()) {
      entries.insert(entry);
      EXPECT_EQ(taken.MarkDone(entry), 0);
    }
    EXPECT_EQ(taken.Finish(), 0);
  }
}

using CrashStepsTest = QueueSandboxTest;

TEST_F(CrashStepsTest, LoseNoEntry) {
  bool isKilled = true;
  int stop = 0;
  for (; isKilled; ++stop) {
    SCOPED_TRACE(stop);
    for (const char* file : {kQueueFile, kTakenFile, kJournalFile, kLaterFile}) {
      RemoveTree(file);
    }
    SharedFlags processed;
    WriteFile(kJournalFile, "/a\n/c\n");
    WriteFile(kLaterFile, "/b\n");
    AppendToQueue({"/a", "/c", "/t"});
    isKilled = KillAtStop(stop, processed);
    const std::set<std::string> found = TakeAll();
    for (const char entry : {'a', 'b'}) {
      if (processed[entry] == 0) {
        EXPECT_THAT(found, Contains(std::string("/") + entry));
      }
    }
    EXPECT_THAT(found, Contains("/c"));
    EXPECT_THAT(found, Contains("/t"));
    if (processed['b'] != 0) {
      EXPECT_THAT(found, Contains("/n"));
    }
    if (HasFailure()) {
      return;
    }
  }
  EXPECT_GT(stop, 100) << "not one for each system call";
}

}  // namespace
}  // namespace vela_test

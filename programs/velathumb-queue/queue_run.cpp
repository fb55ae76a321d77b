#include "queue_run.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <functional>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "batch.h"
#include "command_check.h"
#include "conversion_pause.h"
#include "posix/event_wait.h"
#include "posix/service_log.h"
#include "progress_line.h"
#include "progress_totals.h"
#include "storage/unfinished_directories.h"
#include "taken_queue.h"

namespace vela {

namespace {

using std::chrono::milliseconds;
using Clock = EntryPlan::Clock;

/// Interval of the attempts to lock a file of the queue that is locked.
constexpr milliseconds kLockedFilePause(200);
/// velathumb queues a directory again when there is more to make in it: twice, for a photo that
/// succeeds. One that is queued more often is deferred.
constexpr int kMaxRounds = 16;

/// Returns whether the cause of an errno value may pass without an administrator, such as a full
/// volume.
bool CanPass(int error) {
  switch (error) {
    case ENOSPC:
    case EDQUOT:
    case EIO:
    case EROFS:
    case ENOMEM:
    case EMFILE:
    case ENFILE:
      return true;
    default:
      return false;
  }
}

/// Processes one queue after the other.
class QueueRun {
 public:
  explicit QueueRun(const RunSettings& settings)
      : settings_(settings), taken_(PhotoQueuePaths()), totals_(settings.checkVideos) {}

  RunEnd Run();

 private:
  RunEnd RunRounds();
  RunEnd RunRound(bool& isIdle);
  RunEnd ProcessTaken(TakenQueue::Outcome outcome);
  bool WaitUntilAllowed();
  void SetTotals(TakenQueue::Outcome outcome);
  bool WaitWithTotals(TakenQueue::Outcome outcome);
  bool RecordSeen();
  std::vector<std::string> FindEndless();
  RunEnd DeferEndless(const std::vector<std::string>& entries);
  int RetryWhileLocked(const std::function<int()>& act);
  RunEnd FinishTaken();
  int RequeueDeferred();
  void WaitForEntries();
  void Follow(bool isIdle);
  bool RequeueAfterAll();
  void QueueUnfinished();
  bool WaitAfterFailure(RunEnd end);
  RunEnd EndWhenIdle();

  const RunSettings& settings_;
  TakenQueue taken_;
  ProgressTotals totals_;
  EventWait events_;
  PauseGate gate_;
  EntryHistories histories_;
  ProgressLine progress_;
  bool isIdle_ = true;                            // no entry was in progress before
  bool hasHandedBack_ = false;                    // in the last round
  bool hasDeferred_ = false;                      // entries are left for a later run
  std::unordered_set<std::string> seen_;          // entries since the queue was last empty
  std::unordered_map<std::string, int> repeats_;  // rounds in a row with only entries seen before
  Clock::time_point lastRequeue_;
  bool hasRequeued_ = false;  // the last attempt has succeeded
  int failures_ = 0;          // in a row, of reading or writing a file of the queue
};

/// Records the taken entries. Returns whether all of them were recorded before.
bool QueueRun::RecordSeen() {
  const size_t before = seen_.size();
  seen_.insert(taken_.Entries().begin(), taken_.Entries().end());
  return seen_.size() == before;
}

/// Waits until conversion may run. Returns false when a signal ended the wait.
bool QueueRun::WaitUntilAllowed() {
  while (!events_.IsStopping() && !gate_.MayStart()) {
    const auto left = std::chrono::ceil<milliseconds>(*gate_.NextCheck() - Clock::now());
    events_.Wait(std::max(left, milliseconds(0)));
  }
  return !events_.IsStopping();
}

void QueueRun::SetTotals(TakenQueue::Outcome outcome) {
  if (isIdle_ && outcome == TakenQueue::Outcome::kTaken) {
    totals_.Reset();
  }
  isIdle_ = false;
  totals_.Set(taken_.Entries(), [this] { return events_.MustStop(); });
}

/// Sets the totals and waits until conversion may run. Returns false when a signal ended the wait.
bool QueueRun::WaitWithTotals(TakenQueue::Outcome outcome) {
  if (gate_.MayStart()) {
    SetTotals(outcome);
    return !events_.IsStopping();
  }
  // During the pause others see what is outstanding instead of the end of an earlier run.
  SetTotals(outcome);
  if (!WaitUntilAllowed()) {
    return false;
  }
  totals_.Update(taken_.Entries(), [this] { return events_.MustStop(); });
  return true;
}

/// Repeats `act` while it finds a file locked. Returns its last result: EWOULDBLOCK when a signal
/// ended the wait.
int QueueRun::RetryWhileLocked(const std::function<int()>& act) {
  int error = act();
  while (error == EWOULDBLOCK && !events_.IsStopping()) {
    events_.Wait(kLockedFilePause);
    error = act();
  }
  return error;
}

RunEnd QueueRun::FinishTaken() {
  const int error = RetryWhileLocked([this] { return taken_.Finish(); });
  if (error == 0) {
    return RunEnd::kEmpty;
  }
  if (error == EWOULDBLOCK) {
    return RunEnd::kStopped;
  }
  WriteLog(LogLevel::kError, "cannot remove the finished queue", error);
  return RunEnd::kNotRecorded;
}

RunEnd QueueRun::ProcessTaken(TakenQueue::Outcome outcome) {
  const size_t count = taken_.Entries().size();
  WriteLog(LogLevel::kInfo,
           (outcome == TakenQueue::Outcome::kResumed ? "resuming with " : "took ") +
               std::to_string(count) + (count == 1 ? " entry" : " entries"));
  if (!WaitWithTotals(outcome)) {
    return RunEnd::kStopped;
  }
  Batch batch(settings_, taken_, events_, gate_, histories_, progress_);
  const RunEnd end = batch.Run();
  hasHandedBack_ = batch.HasHandedBack();
  hasDeferred_ = hasDeferred_ || batch.DeferredCount() > 0;
  return end == RunEnd::kEmpty ? FinishTaken() : end;
}

/// Counts the rounds in a row in which each entry was taken, as long as no new one is among them.
/// Returns the entries that were taken too often.
std::vector<std::string> QueueRun::FindEndless() {
  std::vector<std::string> endless;
  if (!RecordSeen()) {
    repeats_.clear();
    return endless;
  }
  // That postponed entries were put back into the queue does not mean that they were processed.
  if (hasHandedBack_) {
    return endless;
  }
  for (const std::string& entry : taken_.Entries()) {
    if (++repeats_[entry] > kMaxRounds) {
      endless.push_back(entry);
    }
  }
  return endless;
}

/// The next round processes the others.
RunEnd QueueRun::DeferEndless(const std::vector<std::string>& entries) {
  const int error = taken_.Defer(entries);
  if (error != 0) {
    WriteLog(LogLevel::kError, "cannot defer an entry", error);
    return RunEnd::kNotRecorded;
  }
  WriteLog(LogLevel::kWarning,
           "the same entries are queued again and again, deferred to a later run");
  hasDeferred_ = true;
  for (const std::string& entry : entries) {
    repeats_.erase(entry);
  }
  return entries.size() == taken_.Entries().size() ? FinishTaken() : RunEnd::kEmpty;
}

/// Returns 0 also when a signal ended the wait, or an errno value, which is logged.
int QueueRun::RequeueDeferred() {
  const int error = RetryWhileLocked([this] { return taken_.RequeueDeferred(); });
  lastRequeue_ = Clock::now();
  hasRequeued_ = error == 0 || error == EWOULDBLOCK;
  if (hasRequeued_) {
    return 0;
  }
  WriteLog(LogLevel::kError, "cannot put deferred entries back into the queue", error);
  return error;
}

void QueueRun::WaitForEntries() {
  // The watch reports every new queue; the limit is for file systems that report nothing.
  constexpr milliseconds kLongestWait = std::chrono::minutes(1);
  isIdle_ = true;
  progress_.Hide();
  repeats_.clear();
  seen_.clear();
  histories_.clear();
  events_.Wait(kLongestWait);
}

/// Waits for new entries when there are none. Puts deferred ones back every hour, or a minute after
/// that has failed, also when the runner is never idle.
void QueueRun::Follow(bool isIdle) {
  constexpr std::chrono::minutes kInterval(60);
  constexpr std::chrono::minutes kRetryInterval(1);
  if (isIdle) {
    WaitForEntries();
  }
  if (Clock::now() - lastRequeue_ >= (hasRequeued_ ? kInterval : kRetryInterval)) {
    RequeueDeferred();
  }
}

/// Waits, longer each time, when `end` is a failure that can pass and the runner is to keep
/// running: a full volume of the queue must not end a service. Returns whether to continue.
bool QueueRun::WaitAfterFailure(RunEnd end) {
  constexpr int kDoublings = 6;
  if (end != RunEnd::kNotRecorded || !settings_.follow || !CanPass(taken_.LastError())) {
    return false;
  }
  const std::chrono::seconds pause(1 << std::min(failures_, kDoublings));
  ++failures_;
  WriteLog(LogLevel::kInfo, "trying again in " + std::to_string(pause.count()) +
                                (pause.count() == 1 ? " second" : " seconds"));
  for (const auto resume = Clock::now() + pause; Clock::now() < resume && !events_.IsStopping();) {
    events_.Wait(std::chrono::ceil<milliseconds>(resume - Clock::now()));
  }
  return true;
}

/// Queues the directories that a velathumb could not queue, also one that this runner has not
/// started. Other notes concern only the velathumb that made them.
void QueueRun::QueueUnfinished() {
  std::unordered_set<std::string> lost;
  TakeUnfinishedDirectories([&](const UnfinishedDirectory& note) {
    const bool isLost =
        note.reason == UnfinishedReason::kNotQueued && note.path.find('\n') == std::string::npos;
    if (isLost) {
      lost.insert(note.path);
    }
    return !isLost;
  });
  if (!lost.empty() && taken_.AddToQueue({lost.begin(), lost.end()}) == 0) {
    TakeUnfinishedDirectories(
        [&](const UnfinishedDirectory& note) { return lost.count(note.path) != 0; });
  }
}

/// Takes the pending entries and processes them. Sets `isIdle` when there are none.
RunEnd QueueRun::RunRound(bool& isIdle) {
  switch (CheckProfileUse(settings_.velathumb.profileFile, [this] { return events_.MustStop(); })) {
    case ProfileState::kUnusable:
      return RunEnd::kMisconfigured;
    case ProfileState::kInterrupted:
      return RunEnd::kStopped;
    case ProfileState::kUsable:
    case ProfileState::kUsableNow:
      break;
  }
  QueueUnfinished();
  const TakenQueue::Outcome outcome = taken_.Take();
  switch (outcome) {
    case TakenQueue::Outcome::kFailed:
      return RunEnd::kNotRecorded;
    case TakenQueue::Outcome::kBusy:
      events_.Wait(kLockedFilePause);
      return RunEnd::kEmpty;
    case TakenQueue::Outcome::kNothing:
      isIdle = true;
      return RunEnd::kEmpty;
    case TakenQueue::Outcome::kResumed:
    case TakenQueue::Outcome::kTaken:
      break;
  }
  const std::vector<std::string> endless = FindEndless();
  return endless.empty() ? ProcessTaken(outcome) : DeferEndless(endless);
}

RunEnd QueueRun::EndWhenIdle() {
  if (!hasRequeued_) {
    return RunEnd::kFailed;
  }
  return hasDeferred_ ? RunEnd::kDeferred : RunEnd::kEmpty;
}

/// Puts deferred entries back that could not be put back before: processing the queue may have made
/// room for them.
bool QueueRun::RequeueAfterAll() {
  return !hasRequeued_ && RequeueDeferred() == 0;
}

RunEnd QueueRun::RunRounds() {
  while (!events_.IsStopping()) {
    bool isIdle = false;
    const RunEnd end = RunRound(isIdle);
    if (end != RunEnd::kEmpty) {
      if (!WaitAfterFailure(end)) {
        return end;
      }
      continue;
    }
    failures_ = 0;
    if (settings_.follow) {
      Follow(isIdle);
    } else if (isIdle && !RequeueAfterAll()) {
      return EndWhenIdle();
    }
  }
  return RunEnd::kStopped;
}

RunEnd QueueRun::Run() {
  const int error = events_.Open(PhotoQueuePaths().queue);
  if (error != 0) {
    WriteLog(LogLevel::kError, "cannot watch the queue", error);
    return RunEnd::kFailed;
  }
  ExpectUnfinishedDirectories();
  const int requeueError = RequeueDeferred();
  return requeueError == 0 || CanPass(requeueError) ? RunRounds() : RunEnd::kFailed;
}

}  // namespace

RunEnd RunQueue(const RunSettings& settings) {
  return QueueRun(settings).Run();
}

}  // namespace vela

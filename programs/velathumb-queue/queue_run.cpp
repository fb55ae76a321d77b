#include "queue_run.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <unordered_set>

#include "conversion_pause.h"
#include "entry_check.h"
#include "entry_plan.h"
#include "posix/child_process.h"
#include "posix/event_wait.h"
#include "posix/service_log.h"
#include "progress_totals.h"
#include "taken_queue.h"

namespace vela {

namespace {

using std::chrono::milliseconds;
using Clock = EntryPlan::Clock;

/// How long an entry is postponed while its directory is locked by another velathumb.
constexpr std::chrono::seconds kLockedDirectoryPause(2);
/// How long it is postponed after its velathumb was killed or failed, times the number of tries.
constexpr milliseconds kRetryPause(200);
/// Interval of the attempts to lock a file of the queue that is locked.
constexpr milliseconds kLockedFilePause(200);
/// After so many failed tries an entry is deferred: it probably causes the failures.
constexpr int kMaxTries = 25;
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

/// Starts velathumb for one entry. It ends with this process, however that ends: an orphan would
/// keep its directory locked. Must be called from the main thread. Returns 0 and stores the process
/// id, or an errno value.
int StartVelathumb(const VelathumbCommand& command, std::string entry, pid_t& pid) {
  std::string path = command.path;
  std::string profileFile = command.profileFile;
  char* const arguments[] = {path.data(), profileFile.data(), entry.data(), nullptr};
  return StartAttachedChild(path.c_str(), arguments, pid);
}

/// Processes one taken queue.
class Batch {
 public:
  Batch(const RunSettings& settings, TakenQueue& taken, EventWait& events, PauseGate& gate)
      : settings_(settings), taken_(taken), events_(events), gate_(gate), plan_(taken.Entries()) {}

  /// Returns kEmpty when all entries are done or deferred.
  RunEnd Run();

  /// Returns how many entries were deferred to a later run.
  int DeferredCount() const { return deferred_; }

 private:
  void StartEntries();
  bool StartEntry(size_t number);
  void ReapChildren();
  void HandleEnd(size_t number, int status);
  void HandleSuccess(size_t number);
  void Retry(size_t number);
  void Defer(size_t number, const std::string& reason);
  void Finish(size_t number);
  void FailToRecord(size_t number);
  void StopChildren();
  std::optional<milliseconds> WaitTime() const;

  const RunSettings& settings_;
  TakenQueue& taken_;
  EventWait& events_;
  PauseGate& gate_;
  EntryPlan plan_;
  std::map<pid_t, size_t> children_;
  std::map<size_t, int> tries_;
  int deferred_ = 0;
  bool hasFailed_ = false;
  RunEnd failure_ = RunEnd::kFailed;
};

bool Batch::StartEntry(size_t number) {
  const std::string& entry = plan_.Entry(number);
  const std::string obstacle = FindObstacle(entry);
  if (!obstacle.empty()) {
    Defer(number, obstacle);
    return !hasFailed_;
  }
  if (IsLockedElsewhere(TargetOf(entry))) {
    plan_.Postpone(number, Clock::now() + kLockedDirectoryPause);
    return true;
  }
  pid_t child = 0;
  const int error = StartVelathumb(settings_.velathumb, entry, child);
  if (error != 0) {
    WriteLog(LogLevel::kError, "cannot start " + settings_.velathumb.path, error);
    plan_.Postpone(number, Clock::now());
    hasFailed_ = true;
    return false;
  }
  children_.emplace(child, number);
  return true;
}

void Batch::StartEntries() {
  while (static_cast<int>(children_.size()) < settings_.jobs && gate_.MayStart()) {
    const auto number = plan_.Start(Clock::now());
    if (!number || !StartEntry(*number)) {
      return;
    }
  }
}

/// The entry is neither done nor saved: the taken queue must stay.
void Batch::FailToRecord(size_t number) {
  plan_.Postpone(number, Clock::now());
  hasFailed_ = true;
  failure_ = RunEnd::kNotRecorded;
}

void Batch::Defer(size_t number, const std::string& reason) {
  const std::string& entry = plan_.Entry(number);
  const int error = taken_.Defer({entry});
  if (error != 0) {
    WriteLog(LogLevel::kError, "cannot defer an entry", error);
    FailToRecord(number);
    return;
  }
  WriteLog(LogLevel::kWarning, "deferred to a later run, " + reason + ": " + entry);
  ++deferred_;
  tries_.erase(number);
  plan_.Finish(number);
}

void Batch::Finish(size_t number) {
  const int error = taken_.MarkDone(plan_.Entry(number));
  if (error != 0) {
    // What prevents this has probably prevented velathumb from queueing the directory again.
    WriteLog(LogLevel::kWarning, "cannot record that an entry is done", error);
    FailToRecord(number);
    return;
  }
  tries_.erase(number);
  plan_.Finish(number);
}

void Batch::Retry(size_t number) {
  const int tries = ++tries_[number];
  if (tries >= kMaxTries) {
    Defer(number, "velathumb did not complete in any try");
    return;
  }
  if (!events_.IsStopping() && !hasFailed_) {
    WriteLog(LogLevel::kWarning,
             "velathumb did not complete, trying again: " + plan_.Entry(number));
  }
  plan_.Postpone(number, Clock::now() + tries * kRetryPause);
}

/// velathumb exits with 0 also when it skipped a directory or stopped in it.
void Batch::HandleSuccess(size_t number) {
  const std::string& entry = plan_.Entry(number);
  const std::string obstacle = FindObstacle(entry);
  if (!obstacle.empty()) {
    Defer(number, obstacle);
  } else if (IsLockedElsewhere(TargetOf(entry))) {
    plan_.Postpone(number, Clock::now() + kLockedDirectoryPause);
  } else {
    Finish(number);
  }
}

void Batch::HandleEnd(size_t number, int status) {
  if (HasSucceeded(status)) {
    HandleSuccess(number);
    return;
  }
  Retry(number);
}

void Batch::ReapChildren() {
  for (auto child = children_.begin(); child != children_.end();) {
    const auto [pid, number] = *child;
    const std::optional<int> status = ReapEndedChild(pid);
    if (!status) {
      ++child;
      continue;
    }
    child = children_.erase(child);
    HandleEnd(number, *status);
  }
  ReapInheritedChildren([this](pid_t pid) { return children_.count(pid) != 0; });
}

void Batch::StopChildren() {
  for (const auto& child : children_) {
    TerminateChild(child.first);
  }
  while (!children_.empty()) {
    events_.Wait(milliseconds(1000));
    ReapChildren();
  }
}

std::optional<milliseconds> Batch::WaitTime() const {
  std::optional<Clock::time_point> wake = gate_.NextCheck();
  const bool hasFreeJob = static_cast<int>(children_.size()) < settings_.jobs;
  if (!wake && hasFreeJob) {
    wake = plan_.NextStart();
  }
  if (!wake) {
    return std::nullopt;
  }
  // An entry that waits only for another one needs no time limit: the end of that one wakes the
  // runner.
  const auto left = std::chrono::ceil<milliseconds>(*wake - Clock::now());
  return left > milliseconds(0) ? left : milliseconds(children_.empty() ? 0 : 1000);
}

RunEnd Batch::Run() {
  while (!plan_.IsFinished() && !events_.IsStopping() && !hasFailed_) {
    StartEntries();
    if (plan_.IsFinished() || hasFailed_) {
      break;
    }
    events_.Wait(WaitTime());
    ReapChildren();
  }
  StopChildren();
  if (hasFailed_) {
    return failure_;
  }
  return plan_.IsFinished() ? RunEnd::kEmpty : RunEnd::kStopped;
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
  bool RecordSeen();
  RunEnd DeferAll();
  int RetryWhileLocked(const std::function<int()>& act);
  RunEnd FinishTaken();
  int RequeueDeferred();
  void WaitForEntries();
  bool WaitAfterFailure(RunEnd end);
  RunEnd EndWhenIdle();

  const RunSettings& settings_;
  TakenQueue taken_;
  ProgressTotals totals_;
  EventWait events_;
  PauseGate gate_;
  bool isIdle_ = true;                    // no entry was in progress before
  bool hasDeferred_ = false;              // entries are left for a later run
  std::unordered_set<std::string> seen_;  // entries since the queue was last empty
  int rounds_ = 0;                        // in a row with only entries seen before
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
  totals_.Set(taken_.Entries(), [this] {
    events_.Wait(milliseconds(0));
    return events_.IsStopping();
  });
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
  if (!WaitUntilAllowed()) {
    return RunEnd::kStopped;
  }
  SetTotals(outcome);
  Batch batch(settings_, taken_, events_, gate_);
  const RunEnd end = batch.Run();
  hasDeferred_ = hasDeferred_ || batch.DeferredCount() > 0;
  return end == RunEnd::kEmpty ? FinishTaken() : end;
}

RunEnd QueueRun::DeferAll() {
  const int error = taken_.Defer(taken_.Entries());
  if (error != 0) {
    WriteLog(LogLevel::kError, "cannot defer an entry", error);
    return RunEnd::kNotRecorded;
  }
  WriteLog(LogLevel::kWarning,
           "the same entries are queued again and again, deferred to a later run");
  hasDeferred_ = true;
  return FinishTaken();
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
  constexpr milliseconds kRequeueInterval = std::chrono::hours(1);
  isIdle_ = true;
  rounds_ = 0;
  seen_.clear();
  events_.Wait(kLongestWait);
  if (Clock::now() - lastRequeue_ >= (hasRequeued_ ? kRequeueInterval : kLongestWait)) {
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

/// Takes the pending entries and processes them. Sets `isIdle` when there are none.
RunEnd QueueRun::RunRound(bool& isIdle) {
  if (!IsProfileUsable(settings_.velathumb.profileFile)) {
    return RunEnd::kFailed;
  }
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
  rounds_ = RecordSeen() ? rounds_ + 1 : 0;
  return rounds_ > kMaxRounds ? DeferAll() : ProcessTaken(outcome);
}

RunEnd QueueRun::EndWhenIdle() {
  if (!hasRequeued_) {
    return RunEnd::kFailed;
  }
  return hasDeferred_ ? RunEnd::kDeferred : RunEnd::kEmpty;
}

RunEnd QueueRun::RunRounds() {
  while (!events_.IsStopping()) {
    bool isIdle = false;
    const RunEnd end = RunRound(isIdle);
    if (end != RunEnd::kEmpty && !WaitAfterFailure(end)) {
      return end;
    }
    if (end != RunEnd::kEmpty) {
      continue;
    }
    failures_ = 0;
    // Processing the queue may have made room for them.
    if (isIdle && !hasRequeued_ && !settings_.follow && RequeueDeferred() == 0) {
      continue;
    }
    if (isIdle && !settings_.follow) {
      return EndWhenIdle();
    }
    if (isIdle) {
      WaitForEntries();
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
  const int requeueError = RequeueDeferred();
  return requeueError == 0 || CanPass(requeueError) ? RunRounds() : RunEnd::kFailed;
}

}  // namespace

RunEnd RunQueue(const RunSettings& settings) {
  return QueueRun(settings).Run();
}

}  // namespace vela

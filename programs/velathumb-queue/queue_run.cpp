#include "queue_run.h"

#include <sys/wait.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <unordered_set>

#include "conversion_pause.h"
#include "directory_probe.h"
#include "entry_check.h"
#include "entry_plan.h"
#include "event_wait.h"
#include "profile_check.h"
#include "progress_totals.h"
#include "run_log.h"
#include "taken_queue.h"

namespace vela {

namespace {

using std::chrono::milliseconds;
using Clock = EntryPlan::Clock;

/// How long an entry waits whose directory somebody else works on.
constexpr std::chrono::seconds kLockedPause(2);
/// How long it waits after its velathumb was killed, times the number of tries.
constexpr milliseconds kRetryPause(200);
/// How long it is before a file of the queue that somebody holds is looked at again.
constexpr milliseconds kBusyPause(200);
/// After so many tries velathumb itself is at fault with this entry.
constexpr int kMostTries = 25;
/// velathumb enters a directory again when more is to be made in it: twice, for a photo that
/// succeeds. One that comes back more often is left for another run.
constexpr int kMostRounds = 16;

/// Works one taken queue off.
class Batch {
 public:
  Batch(const RunSettings& settings, TakenQueue& taken, EventWait& events, PauseGate& gate)
      : settings_(settings), taken_(taken), events_(events), gate_(gate), plan_(taken.Entries()) {}

  /// Returns kEmpty when all entries are done or left for later.
  RunEnd Run();

  /// Returns how many entries were left for later.
  int LeftCount() const { return left_; }

 private:
  void StartEntries();
  bool StartEntry(size_t number);
  void ReapChildren();
  void TakeEnd(size_t number, int status);
  void TakeSuccess(size_t number);
  void Retry(size_t number);
  void Leave(size_t number, const std::string& reason);
  void Finish(size_t number);
  void StopChildren();
  std::optional<milliseconds> TimeToWait() const;

  const RunSettings& settings_;
  TakenQueue& taken_;
  EventWait& events_;
  PauseGate& gate_;
  EntryPlan plan_;
  std::map<pid_t, size_t> children_;
  std::map<size_t, int> tries_;
  int left_ = 0;
  bool hasFailed_ = false;
};

bool Batch::StartEntry(size_t number) {
  const std::string& entry = plan_.Entry(number);
  const std::string hindrance = FindHindrance(entry);
  if (!hindrance.empty()) {
    Leave(number, hindrance);
    return !hasFailed_;
  }
  if (IsLockedElsewhere(TargetOf(entry))) {
    plan_.PutOff(number, Clock::now() + kLockedPause);
    return true;
  }
  int error = 0;
  const pid_t child = StartChild(settings_.program, entry, error);
  if (child == 0) {
    WriteLog(LogLevel::kError, "cannot start " + settings_.program.path + ": " + ErrnoText(error));
    plan_.PutOff(number, Clock::now());
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

void Batch::Leave(size_t number, const std::string& reason) {
  const std::string& entry = plan_.Entry(number);
  WriteLog(LogLevel::kWarning, "left for a later run, " + reason + ": " + entry);
  const int error = taken_.Leave(entry);
  if (error != 0) {
    // Not done and not kept: the queue in hand must stay.
    WriteLog(LogLevel::kError, "cannot keep it: " + ErrnoText(error));
    plan_.PutOff(number, Clock::now());
    hasFailed_ = true;
    return;
  }
  ++left_;
  tries_.erase(number);
  plan_.Finish(number);
}

void Batch::Finish(size_t number) {
  const int error = taken_.MarkDone(plan_.Entry(number));
  if (error != 0) {
    // A later run repeats the entry, no more.
    WriteLog(LogLevel::kWarning, "cannot note that an entry is done: " + ErrnoText(error));
  }
  tries_.erase(number);
  plan_.Finish(number);
}

void Batch::Retry(size_t number) {
  const int tries = ++tries_[number];
  if (tries < kMostTries) {
    plan_.PutOff(number, Clock::now() + tries * kRetryPause);
    return;
  }
  Leave(number, "velathumb was ended each time");
}

/// velathumb ends with 0 also when it passed over a directory or stopped in it.
void Batch::TakeSuccess(size_t number) {
  const std::string& entry = plan_.Entry(number);
  const std::string hindrance = FindHindrance(entry);
  if (!hindrance.empty()) {
    Leave(number, hindrance);
  } else if (IsLockedElsewhere(TargetOf(entry))) {
    plan_.PutOff(number, Clock::now() + kLockedPause);
  } else {
    Finish(number);
  }
}

void Batch::TakeEnd(size_t number, int status) {
  if (WIFEXITED(status) && WEXITSTATUS(status) == 0) {
    TakeSuccess(number);
    return;
  }
  if (!events_.IsStopping()) {
    WriteLog(LogLevel::kWarning, "velathumb was ended, trying again: " + plan_.Entry(number));
  }
  Retry(number);
}

void Batch::ReapChildren() {
  int status = 0;
  for (pid_t child = 0; (child = waitpid(-1, &status, WNOHANG)) > 0;) {
    const auto found = children_.find(child);
    if (found == children_.end()) {
      continue;
    }
    const size_t number = found->second;
    children_.erase(found);
    TakeEnd(number, status);
  }
}

void Batch::StopChildren() {
  for (const auto& child : children_) {
    kill(child.first, SIGTERM);
  }
  while (!children_.empty()) {
    events_.Wait(milliseconds(1000));
    ReapChildren();
  }
}

std::optional<milliseconds> Batch::TimeToWait() const {
  std::optional<Clock::time_point> wake = gate_.AskAgain();
  const bool hasRoom = static_cast<int>(children_.size()) < settings_.jobs;
  if (!wake && hasRoom) {
    wake = plan_.NextStart();
  }
  if (!wake) {
    return std::nullopt;
  }
  // An entry that only waits for another's end has no time of its own: that end wakes the runner.
  const auto left = std::chrono::ceil<milliseconds>(*wake - Clock::now());
  return left > milliseconds(0) ? left : milliseconds(children_.empty() ? 0 : 1000);
}

RunEnd Batch::Run() {
  while (!plan_.IsFinished() && !events_.IsStopping() && !hasFailed_) {
    StartEntries();
    if (plan_.IsFinished() || hasFailed_) {
      break;
    }
    events_.Wait(TimeToWait());
    ReapChildren();
  }
  StopChildren();
  if (hasFailed_) {
    return RunEnd::kFailed;
  }
  return plan_.IsFinished() ? RunEnd::kEmpty : RunEnd::kStopped;
}

/// Takes one queue after the other.
class QueueRun {
 public:
  explicit QueueRun(const RunSettings& settings)
      : settings_(settings), taken_(PhotoQueuePaths()), totals_(settings.checkVideos) {}

  RunEnd Run();

 private:
  RunEnd RunRounds();
  RunEnd RunRound(bool& isIdle);
  RunEnd WorkOff(TakenQueue::Outcome outcome);
  bool WaitForPermission();
  void SetTotals(TakenQueue::Outcome outcome);
  bool HasSeenAll();
  RunEnd LeaveAll();
  int AskUntilFree(const std::function<int()>& act);
  RunEnd FinishTaken();
  bool PutBackLeft();
  void WaitForEntries();

  const RunSettings& settings_;
  TakenQueue taken_;
  ProgressTotals totals_;
  EventWait events_;
  PauseGate gate_;
  bool isIdle_ = true;                    // nothing was in hand before
  bool hasLeft_ = false;                  // entries for a later run
  std::unordered_set<std::string> seen_;  // since nothing waited last
  int rounds_ = 0;                        // without a new one among them
  Clock::time_point putBack_;
};

/// Returns whether all entries that were taken have been there before.
bool QueueRun::HasSeenAll() {
  const size_t before = seen_.size();
  seen_.insert(taken_.Entries().begin(), taken_.Entries().end());
  return seen_.size() == before;
}

/// Returns false when the wait was ended by a signal.
bool QueueRun::WaitForPermission() {
  while (!events_.IsStopping() && !gate_.MayStart()) {
    const auto left = std::chrono::ceil<milliseconds>(*gate_.AskAgain() - Clock::now());
    events_.Wait(std::max(left, milliseconds(0)));
  }
  return !events_.IsStopping();
}

void QueueRun::SetTotals(TakenQueue::Outcome outcome) {
  if (isIdle_ && outcome == TakenQueue::Outcome::kTaken) {
    totals_.BeginAnew();
  }
  isIdle_ = false;
  totals_.Set(taken_.Entries(), [this] {
    events_.Wait(milliseconds(0));
    return events_.IsStopping();
  });
}

/// Repeats what finds a file held by somebody. Returns its last result: EWOULDBLOCK when the wait
/// was ended by a signal.
int QueueRun::AskUntilFree(const std::function<int()>& act) {
  int error = act();
  while (error == EWOULDBLOCK && !events_.IsStopping()) {
    events_.Wait(kBusyPause);
    error = act();
  }
  return error;
}

RunEnd QueueRun::FinishTaken() {
  const int error = AskUntilFree([this] { return taken_.Finish(); });
  if (error == 0) {
    return RunEnd::kEmpty;
  }
  if (error == EWOULDBLOCK) {
    return RunEnd::kStopped;
  }
  WriteLog(LogLevel::kError, "cannot remove the queue that is done: " + ErrnoText(error));
  return RunEnd::kFailed;
}

RunEnd QueueRun::WorkOff(TakenQueue::Outcome outcome) {
  const size_t count = taken_.Entries().size();
  WriteLog(LogLevel::kInfo,
           (outcome == TakenQueue::Outcome::kResumed ? "going on with " : "took ") +
               std::to_string(count) + (count == 1 ? " entry" : " entries"));
  if (!WaitForPermission()) {
    return RunEnd::kStopped;
  }
  SetTotals(outcome);
  Batch batch(settings_, taken_, events_, gate_);
  const RunEnd end = batch.Run();
  hasLeft_ = hasLeft_ || batch.LeftCount() > 0;
  return end == RunEnd::kEmpty ? FinishTaken() : end;
}

RunEnd QueueRun::LeaveAll() {
  WriteLog(LogLevel::kWarning, "entries come back again and again, left for a later run");
  hasLeft_ = true;
  for (const std::string& entry : taken_.Entries()) {
    const int error = taken_.Leave(entry);
    if (error != 0) {
      WriteLog(LogLevel::kError, "cannot keep an entry: " + ErrnoText(error));
      return RunEnd::kFailed;
    }
  }
  return FinishTaken();
}

/// Returns false when that failed, which is told in the log.
bool QueueRun::PutBackLeft() {
  putBack_ = Clock::now();
  const int error = AskUntilFree([this] { return taken_.PutBackLeft(); });
  if (error != 0 && error != EWOULDBLOCK) {
    WriteLog(LogLevel::kError, "cannot put back what was left: " + ErrnoText(error));
  }
  return error == 0 || error == EWOULDBLOCK;
}

void QueueRun::WaitForEntries() {
  // The watch tells of every new queue; the limit is for a file system that tells nothing.
  constexpr milliseconds kLongestWait = std::chrono::minutes(1);
  constexpr std::chrono::hours kLater(1);
  isIdle_ = true;
  rounds_ = 0;
  seen_.clear();
  events_.Wait(kLongestWait);
  if (Clock::now() - putBack_ >= kLater) {
    PutBackLeft();
  }
}

/// Takes what waits and works it off. Sets `isIdle` when nothing waits.
RunEnd QueueRun::RunRound(bool& isIdle) {
  if (!IsProfileUsable(settings_.program.profileFile)) {
    return RunEnd::kFailed;
  }
  const TakenQueue::Outcome outcome = taken_.Take();
  switch (outcome) {
    case TakenQueue::Outcome::kFailed:
      return RunEnd::kFailed;
    case TakenQueue::Outcome::kBusy:
      events_.Wait(kBusyPause);
      return RunEnd::kEmpty;
    case TakenQueue::Outcome::kNothing:
      isIdle = true;
      return RunEnd::kEmpty;
    case TakenQueue::Outcome::kResumed:
    case TakenQueue::Outcome::kTaken:
      break;
  }
  rounds_ = HasSeenAll() ? rounds_ + 1 : 0;
  return rounds_ > kMostRounds ? LeaveAll() : WorkOff(outcome);
}

RunEnd QueueRun::RunRounds() {
  while (!events_.IsStopping()) {
    bool isIdle = false;
    const RunEnd end = RunRound(isIdle);
    if (end != RunEnd::kEmpty) {
      return end;
    }
    if (isIdle && !settings_.follow) {
      return hasLeft_ ? RunEnd::kLeft : RunEnd::kEmpty;
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
    WriteLog(LogLevel::kError, "cannot watch the queue: " + ErrnoText(error));
    return RunEnd::kFailed;
  }
  return PutBackLeft() ? RunRounds() : RunEnd::kFailed;
}

}  // namespace

RunEnd RunQueue(const RunSettings& settings) {
  return QueueRun(settings).Run();
}

}  // namespace vela

#include "queue_run.h"

#include <sys/wait.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <map>
#include <optional>
#include <string>
#include <unordered_set>

#include "conversion_pause.h"
#include "directory_probe.h"
#include "entry_plan.h"
#include "event_wait.h"
#include "progress_totals.h"
#include "run_log.h"
#include "taken_queue.h"

namespace {

using std::chrono::milliseconds;
using Clock = EntryPlan::Clock;

/// How long an entry waits whose directory somebody else works on.
constexpr std::chrono::seconds kLockedPause(2);
/// How long the answer that conversion may run is good for: entries can follow each other fast.
constexpr std::chrono::seconds kAnswerLife(1);
/// How long it waits after its velathumb was killed, times the number of tries.
constexpr milliseconds kRetryPause(200);
/// After so many tries velathumb itself is at fault with this entry.
constexpr int kMostTries = 25;
/// velathumb enters a directory again when more is to be made in it: twice, for a photo that
/// succeeds. One that comes back more often is left for another run.
constexpr int kMostRounds = 16;

/// Works one taken queue off.
class Batch {
 public:
  Batch(const RunSettings& settings, TakenQueue& taken, EventWait& events)
      : settings_(settings), taken_(taken), events_(events), plan_(taken.Entries()) {}

  /// Returns kEmpty when all entries are done.
  RunEnd Run();

 private:
  bool MayStart();
  void StartEntries();
  bool StartEntry(size_t number);
  void ReapChildren();
  void TakeEnd(size_t number, int status);
  void Retry(size_t number);
  void Finish(size_t number);
  void StopChildren();
  std::optional<milliseconds> TimeToWait() const;

  const RunSettings& settings_;
  TakenQueue& taken_;
  EventWait& events_;
  EntryPlan plan_;
  std::map<pid_t, size_t> children_;
  std::map<size_t, int> tries_;
  Clock::time_point mayStartUntil_;
  std::optional<Clock::time_point> pausedUntil_;
  std::string pauseReason_;
  bool hasFailed_ = false;
};

bool Batch::MayStart() {
  const auto now = Clock::now();
  if (pausedUntil_ && now < *pausedUntil_) {
    return false;
  }
  if (now < mayStartUntil_) {
    return true;
  }
  const auto pause = FindConversionPause();
  if (!pause) {
    pausedUntil_.reset();
    pauseReason_.clear();
    mayStartUntil_ = now + kAnswerLife;
    return true;
  }
  if (pause->reason != pauseReason_) {
    WriteLog(LogLevel::kInfo, "waiting: " + pause->reason);
    pauseReason_ = pause->reason;
  }
  pausedUntil_ = Clock::now() + pause->askAgain;
  return false;
}

bool Batch::StartEntry(size_t number) {
  const std::string& entry = plan_.Entry(number);
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
  while (static_cast<int>(children_.size()) < settings_.jobs && MayStart()) {
    const auto number = plan_.Start(Clock::now());
    if (!number || !StartEntry(*number)) {
      return;
    }
  }
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
  WriteLog(LogLevel::kError, "giving up, velathumb was ended each time: " + plan_.Entry(number));
  Finish(number);
}

void Batch::TakeEnd(size_t number, int status) {
  if (WIFEXITED(status) && WEXITSTATUS(status) == 0) {
    Finish(number);
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
  std::optional<Clock::time_point> wake = pausedUntil_;
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
  explicit QueueRun(const RunSettings& settings) : settings_(settings), taken_(PhotoQueuePaths()) {}

  RunEnd Run();

 private:
  RunEnd WorkOff(TakenQueue::Outcome outcome);
  bool HasSeenAll();
  void WaitForEntries();

  const RunSettings& settings_;
  TakenQueue taken_;
  EventWait events_;
  bool isIdle_ = true;                    // nothing was in hand before
  std::unordered_set<std::string> seen_;  // since nothing waited last
  int rounds_ = 0;                        // without a new one among them
};

/// Returns whether all entries that were taken have been there before.
bool QueueRun::HasSeenAll() {
  const size_t before = seen_.size();
  seen_.insert(taken_.Entries().begin(), taken_.Entries().end());
  return seen_.size() == before;
}

RunEnd QueueRun::WorkOff(TakenQueue::Outcome outcome) {
  const size_t count = taken_.Entries().size();
  WriteLog(LogLevel::kInfo,
           (outcome == TakenQueue::Outcome::kResumed ? "going on with " : "took ") +
               std::to_string(count) + (count == 1 ? " entry" : " entries"));
  const bool beginAnew = isIdle_ && outcome == TakenQueue::Outcome::kTaken;
  SetProgressTotals(taken_.Entries(), {beginAnew, settings_.checkVideos});
  isIdle_ = false;
  const RunEnd end = Batch(settings_, taken_, events_).Run();
  if (end != RunEnd::kEmpty) {
    return end;
  }
  const int error = taken_.Finish();
  if (error == 0) {
    return RunEnd::kEmpty;
  }
  WriteLog(LogLevel::kError, "cannot remove the queue that is done: " + ErrnoText(error));
  return RunEnd::kFailed;
}

void QueueRun::WaitForEntries() {
  // The watch tells of every new queue; the limit is for a file system that tells nothing.
  constexpr milliseconds kLongestWait = std::chrono::minutes(1);
  isIdle_ = true;
  rounds_ = 0;
  seen_.clear();
  events_.Wait(kLongestWait);
}

RunEnd QueueRun::Run() {
  const int error = events_.Open(PhotoQueuePaths().queue);
  if (error != 0) {
    WriteLog(LogLevel::kError, "cannot watch the queue: " + ErrnoText(error));
    return RunEnd::kFailed;
  }
  while (!events_.IsStopping()) {
    const TakenQueue::Outcome outcome = taken_.Take();
    if (outcome == TakenQueue::Outcome::kFailed) {
      return RunEnd::kFailed;
    }
    if (outcome == TakenQueue::Outcome::kNothing) {
      if (!settings_.follow) {
        return RunEnd::kEmpty;
      }
      WaitForEntries();
      continue;
    }
    rounds_ = HasSeenAll() ? rounds_ + 1 : 0;
    const RunEnd end = WorkOff(outcome);
    if (end != RunEnd::kEmpty) {
      return end;
    }
    if (rounds_ >= kMostRounds) {
      WriteLog(LogLevel::kWarning, "entries come back again and again; left for the next run");
      if (!settings_.follow) {
        return RunEnd::kEmpty;
      }
      WaitForEntries();
    }
  }
  return RunEnd::kStopped;
}

}  // namespace

RunEnd RunQueue(const RunSettings& settings) {
  return QueueRun(settings).Run();
}

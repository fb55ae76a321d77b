// Processes one taken queue.
#pragma once

#include <chrono>
#include <map>
#include <optional>
#include <string>
#include <unordered_map>
#include <vector>

#include "conversion_pause.h"
#include "entry_plan.h"
#include "posix/child_process.h"
#include "posix/event_wait.h"
#include "posix/file_version.h"
#include "progress_line.h"
#include "queue_run.h"
#include "stall_watch.h"
#include "taken_queue.h"

namespace vela {

/// What has happened to an entry that is not done.
struct EntryHistory {
  int tries = 0;          ///< in which velathumb was killed or failed
  int postponements = 0;  ///< because velathumb could not process the directory
  EntryPlan::Clock::time_point notBefore;
  bool hasSeenNewProfile = false;  ///< the profile has changed while velathumb was running
};

/// By entry. It outlives a batch, because entries can be put back into the queue.
using EntryHistories = std::unordered_map<std::string, EntryHistory>;

/// Returns how long an entry that velathumb could not process is postponed for the `count`th time,
/// from 1; nothing when it is to be deferred to a later run instead.
std::optional<std::chrono::seconds> PostponementFor(int count);

/// Processes the entries of the taken queue, several at a time.
class Batch {
 public:
  Batch(const RunSettings& settings, TakenQueue& taken, EventWait& events, PauseGate& gate,
        EntryHistories& histories, const ProgressLine& progress);

  /// Returns kEmpty when all entries are done, deferred or back in the queue.
  RunEnd Run();

  /// Returns how many entries were deferred to a later run.
  int DeferredCount() const { return deferred_; }

  /// Returns whether postponed entries were put back into the queue because there are new ones.
  bool HasHandedBack() const { return hasHandedBack_; }

 private:
  using Clock = EntryPlan::Clock;

  /// A velathumb that is running.
  struct Child {
    size_t number;
    std::vector<std::string> locked;  ///< directories of its entry that were locked at its start
    FileVersion profile;              ///< at its start
    StallWatch watch;
  };

  void StartEntries();
  bool StartEntry(size_t number);
  bool StartVelathumb(size_t number, std::vector<std::string> locked);
  void ReapChildren();
  void HandleEnd(const Child& child, int status);
  void HandleSuccess(const Child& child);
  bool IsProfileNew(const Child& child);
  bool WasProfileUsable(const Child& child);
  void HandleUnfinished(size_t number, const std::vector<std::string>& directories);
  void CheckProgress();
  bool DoCheck(pid_t pid, Child& child);
  void PostponeUnfinished(size_t number);
  void Retry(size_t number);
  void GiveUp(size_t number, const std::string& reason);
  bool Split(size_t number, const std::string& reason);
  void Defer(size_t number, const std::string& reason);
  bool DeferReadOnlyParts(size_t number, const std::vector<std::string>& entries);
  void Finish(size_t number);
  void End(size_t number);
  void FailToRecord(size_t number);
  void HandBack();
  void StopChildren();
  void ShowProgress() const;
  std::optional<Clock::time_point> NextWake() const;
  std::optional<std::chrono::milliseconds> WaitTime() const;

  const RunSettings& settings_;
  TakenQueue& taken_;
  EventWait& events_;
  PauseGate& gate_;
  EntryHistories& histories_;
  const ProgressLine& progress_;
  EntryPlan plan_;
  std::map<pid_t, Child> children_;
  int deferred_ = 0;
  bool hasHandedBack_ = false;
  std::optional<RunEnd> failure_;
};

}  // namespace vela

#include "batch.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <utility>

#include "command_check.h"
#include "entry_check.h"
#include "ipc/absent_daemon.h"
#include "posix/service_log.h"
#include "storage/unfinished_directories.h"

namespace vela {

namespace {

using std::chrono::milliseconds;

/// How long an entry is postponed after its velathumb was killed or failed, times the number of
/// tries.
constexpr milliseconds kRetryPause(200);
/// After so many failed tries an entry is deferred: it probably causes the failures.
constexpr int kMaxTries = 25;

/// Starts velathumb for one entry. It ends with this process, however that ends: an orphan would
/// keep its directory locked. Must be called from the main thread. Returns 0 and stores the process
/// id, or an errno value.
int StartProcess(const VelathumbCommand& command, std::string entry, pid_t& pid) {
  std::string path = command.path;
  std::string profileFile = command.profileFile;
  char* const arguments[] = {path.data(), profileFile.data(), entry.data(), nullptr};
  return StartAttachedChild(path.c_str(), arguments, pid);
}

/// Tells the velathumb that is started next whether the index daemon is known to be absent: it then
/// need not log that for each photo.
void TellAboutDaemon(bool isAbsent) {
  if (isAbsent) {
    setenv(kAbsentDaemonVariable, "1", 1);
  } else {
    unsetenv(kAbsentDaemonVariable);
  }
}

/// Removes and returns what velathumb has noted about the directories of the entry.
std::vector<std::string> TakeNotesAbout(const EntryTarget& target) {
  const auto notes = TakeUnfinishedDirectories([&](const UnfinishedDirectory& note) {
    return note.path.empty() || DoOverlap(target, TargetOf(note.path));
  });
  std::vector<std::string> directories;
  directories.reserve(notes.size());
  for (const UnfinishedDirectory& note : notes) {
    directories.push_back(note.path);
  }
  return directories;
}

/// Returns whether each directory can be an entry of its own.
bool AreEntries(const std::vector<std::string>& directories) {
  return std::all_of(directories.begin(), directories.end(), [](const std::string& directory) {
    return !directory.empty() && directory.find('\n') == std::string::npos;
  });
}

/// Adds the elements of `more` and removes duplicates.
void Merge(std::vector<std::string>& list, const std::vector<std::string>& more) {
  list.insert(list.end(), more.begin(), more.end());
  std::sort(list.begin(), list.end());
  list.erase(std::unique(list.begin(), list.end()), list.end());
}

}  // namespace

std::optional<std::chrono::seconds> PostponementFor(int count) {
  constexpr int kMostPostponements = 10;
  constexpr int kDoublings = 8;
  constexpr std::chrono::seconds kLongest = std::chrono::minutes(5);
  if (count > kMostPostponements) {
    return std::nullopt;
  }
  return std::min(std::chrono::seconds(1 << std::min(count, kDoublings + 1)), kLongest);
}

Batch::Batch(const RunSettings& settings, TakenQueue& taken, EventWait& events, PauseGate& gate,
             EntryHistories& histories, const ProgressLine& progress)
    : settings_(settings),
      taken_(taken),
      events_(events),
      gate_(gate),
      histories_(histories),
      progress_(progress),
      plan_(taken.Entries()) {
  for (size_t number = 0; number < taken.Entries().size(); ++number) {
    const auto history = histories_.find(plan_.Entry(number));
    if (history != histories_.end()) {
      plan_.Postpone(number, history->second.notBefore);
    }
  }
}

bool Batch::StartVelathumb(size_t number, std::vector<std::string> locked) {
  FileVersion profile;
  profile.Read(settings_.velathumb.profileFile.c_str());
  TellAboutDaemon(gate_.IsDaemonAbsent());
  pid_t pid = 0;
  const int error = StartProcess(settings_.velathumb, plan_.Entry(number), pid);
  if (error != 0) {
    WriteLog(LogLevel::kError, "cannot start " + settings_.velathumb.path, error);
    plan_.Postpone(number, Clock::now());
    failure_ = RunEnd::kFailed;
    return false;
  }
  StallWatch watch(ReadStallLimits(), Clock::now(), [pid] { return ActivityOf(pid); });
  children_.emplace(pid, Child{number, std::move(locked), profile, std::move(watch)});
  return true;
}

bool Batch::StartEntry(size_t number) {
  const std::string& entry = plan_.Entry(number);
  const std::string obstacle = FindObstacle(entry);
  if (!obstacle.empty()) {
    Defer(number, obstacle);
    return !failure_;
  }
  const EntryTarget target = TargetOf(entry);
  std::vector<std::string> locked =
      FindSkippedDirectories(target, [this] { return events_.MustStop(); }).locked;
  if (events_.MustStop()) {
    plan_.Postpone(number, Clock::now());
    return false;
  }
  // The rest of a tree need not wait for one directory.
  if (!target.isTree && !locked.empty()) {
    PostponeUnfinished(number);
    return !failure_;
  }
  TakeNotesAbout(target);
  return StartVelathumb(number, std::move(locked));
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
  failure_ = RunEnd::kNotRecorded;
}

void Batch::End(size_t number) {
  histories_.erase(plan_.Entry(number));
  plan_.Finish(number);
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
  End(number);
}

/// Saves parts of a tree for a later run, which need not repeat the rest. Returns false when the
/// entry itself was deferred or must stay.
bool Batch::DeferReadOnlyParts(size_t number, const std::vector<std::string>& entries) {
  if (entries.empty()) {
    return true;
  }
  if (!AreEntries(entries)) {
    Defer(number, "a part of it is mounted read-only");
    return false;
  }
  const int error = taken_.Defer(entries);
  if (error != 0) {
    WriteLog(LogLevel::kError, "cannot defer a part of a tree", error);
    FailToRecord(number);
    return false;
  }
  for (const std::string& entry : entries) {
    WriteLog(LogLevel::kWarning,
             "deferred to a later run, its volume is mounted read-only: " + entry);
    ++deferred_;
  }
  return true;
}

void Batch::Finish(size_t number) {
  const int error = taken_.MarkDone(plan_.Entry(number));
  if (error != 0) {
    // What prevents this has probably prevented velathumb from queueing the directory again.
    WriteLog(LogLevel::kWarning, "cannot record that an entry is done", error);
    FailToRecord(number);
    return;
  }
  End(number);
}

/// Queues the directories of a tree one by one, so that the one that causes trouble does not keep
/// velathumb from the others. Returns false when that is not possible.
bool Batch::Split(size_t number, const std::string& reason) {
  const EntryTarget target = TargetOf(plan_.Entry(number));
  if (!target.isTree) {
    return false;
  }
  const std::vector<std::string> directories = ListDirectories(target);
  if (!AreEntries(directories) || taken_.AddToQueue(directories) != 0) {
    return false;
  }
  WriteLog(LogLevel::kWarning,
           reason + ", its directories are queued one by one: " + plan_.Entry(number));
  Finish(number);
  return true;
}

void Batch::GiveUp(size_t number, const std::string& reason) {
  if (!Split(number, reason)) {
    Defer(number, reason);
  }
}

void Batch::Retry(size_t number) {
  EntryHistory& history = histories_[plan_.Entry(number)];
  if (++history.tries >= kMaxTries) {
    GiveUp(number, "velathumb did not complete in any try");
    return;
  }
  if (!events_.IsStopping() && !failure_) {
    WriteLog(LogLevel::kWarning,
             "velathumb did not complete, trying again: " + plan_.Entry(number));
  }
  history.notBefore = Clock::now() + history.tries * kRetryPause;
  plan_.Postpone(number, history.notBefore);
}

void Batch::PostponeUnfinished(size_t number) {
  EntryHistory& history = histories_[plan_.Entry(number)];
  const auto pause = PostponementFor(++history.postponements);
  if (!pause) {
    Defer(number, "its directory is locked");
    return;
  }
  history.notBefore = Clock::now() + *pause;
  plan_.Postpone(number, history.notBefore);
}

/// The unfinished directories of a tree become entries of their own, so that the tree is not walked
/// again and again because of them.
void Batch::HandleUnfinished(size_t number, const std::vector<std::string>& directories) {
  if (!TargetOf(plan_.Entry(number)).isTree || !AreEntries(directories)) {
    PostponeUnfinished(number);
    return;
  }
  const int error = taken_.AddToQueue(directories);
  if (error == 0) {
    Finish(number);
  } else if (error == EWOULDBLOCK) {
    PostponeUnfinished(number);
  } else {
    WriteLog(LogLevel::kError, "cannot queue the unfinished directories of a tree", error);
    FailToRecord(number);
  }
}

/// Returns whether the profile has changed since velathumb was started, for the first time.
bool Batch::IsProfileNew(const Child& child) {
  FileVersion profile;
  profile.Read(settings_.velathumb.profileFile.c_str());
  return profile != child.profile &&
         !std::exchange(histories_[plan_.Entry(child.number)].hasSeenNewProfile, true);
}

/// Returns false, having postponed the entry, when velathumb may have found a profile with which it
/// skips directories, for instance one that was just being written.
bool Batch::WasProfileUsable(const Child& child) {
  // The first fault is the only one that is logged.
  if (failure_ != RunEnd::kMisconfigured) {
    const std::string& file = settings_.velathumb.profileFile;
    switch (CheckProfileUse(file, [this] { return events_.MustStop(); })) {
      case ProfileState::kUsable:
        if (!IsProfileNew(child)) {
          return true;
        }
        break;
      case ProfileState::kUnusable:
        failure_ = RunEnd::kMisconfigured;
        break;
      case ProfileState::kUsableNow:
      case ProfileState::kInterrupted:
        break;
    }
  }
  plan_.Postpone(child.number, Clock::now());
  return false;
}

/// velathumb exits with 0 also when it skipped a directory or stopped in it.
void Batch::HandleSuccess(const Child& child) {
  if (!WasProfileUsable(child)) {
    return;
  }
  const std::string& entry = plan_.Entry(child.number);
  const std::string obstacle = FindObstacle(entry);
  if (!obstacle.empty()) {
    Defer(child.number, obstacle);
    return;
  }
  const EntryTarget target = TargetOf(entry);
  SkippedDirectories skipped =
      FindSkippedDirectories(target, [this] { return events_.MustStop(); });
  if (target.isTree && events_.MustStop()) {
    plan_.Postpone(child.number, Clock::now());
    return;
  }
  if (!DeferReadOnlyParts(child.number, skipped.readOnly)) {
    return;
  }
  std::vector<std::string>& unfinished = skipped.locked;
  Merge(unfinished, child.locked);
  Merge(unfinished, TakeNotesAbout(target));
  if (unfinished.empty()) {
    Finish(child.number);
  } else {
    HandleUnfinished(child.number, unfinished);
  }
}

void Batch::HandleEnd(const Child& child, int status) {
  if (HasSucceeded(status)) {
    HandleSuccess(child);
  } else if (child.watch.HasStalled()) {
    GiveUp(child.number, "velathumb made no progress for " +
                             std::to_string(child.watch.Limit().count()) + " seconds");
  } else {
    Retry(child.number);
  }
}

void Batch::ReapChildren() {
  for (auto child = children_.begin(); child != children_.end();) {
    const std::optional<int> status = ReapEndedChild(child->first);
    if (!status) {
      ++child;
      continue;
    }
    const Child ended = std::move(child->second);
    child = children_.erase(child);
    HandleEnd(ended, *status);
  }
  ReapInheritedChildren([this](pid_t pid) { return children_.count(pid) != 0; });
}

/// Returns false when the child cannot even be killed, for instance because it waits for a disk
/// that does not answer.
bool Batch::DoCheck(pid_t pid, Child& child) {
  switch (child.watch.Check(Clock::now())) {
    case StallWatch::Action::kNone:
      break;
    case StallWatch::Action::kTerminate:
      TerminateChild(pid);
      break;
    case StallWatch::Action::kKill:
      KillChild(pid);
      break;
    case StallWatch::Action::kGiveUp:
      return false;
  }
  return true;
}

void Batch::CheckProgress() {
  constexpr int kKilled = 9;  // as a wait status: by SIGKILL
  for (auto child = children_.begin(); child != children_.end();) {
    if (DoCheck(child->first, child->second)) {
      ++child;
      continue;
    }
    // When it ends after all, it is reaped like an inherited child.
    const Child lost = std::move(child->second);
    child = children_.erase(child);
    HandleEnd(lost, kKilled);
  }
}

void Batch::StopChildren() {
  // Together less than services are usually given to stop.
  constexpr std::chrono::seconds kGrace(10);
  const auto start = Clock::now();
  bool isKilled = false;
  for (const auto& child : children_) {
    TerminateChild(child.first);
  }
  while (!children_.empty() && Clock::now() < start + 2 * kGrace) {
    events_.Wait(milliseconds(1000));
    ReapChildren();
    if (!isKilled && Clock::now() >= start + kGrace) {
      for (const auto& child : children_) {
        KillChild(child.first);
      }
      isKilled = true;
    }
  }
}

/// Puts the postponed entries back behind the new ones, when nothing else is left.
void Batch::HandBack() {
  if (!children_.empty() || !taken_.HasNewEntries()) {
    return;
  }
  const std::vector<size_t> numbers = plan_.OnlyPostponed(Clock::now());
  std::vector<std::string> entries;
  entries.reserve(numbers.size());
  for (const size_t number : numbers) {
    entries.push_back(plan_.Entry(number));
  }
  // When it fails, the new entries wait until these are done or deferred.
  if (entries.empty() || taken_.AddToQueue(entries) != 0) {
    return;
  }
  hasHandedBack_ = true;
  for (const size_t number : numbers) {
    const int error = taken_.MarkDone(plan_.Entry(number));
    if (error != 0) {
      WriteLog(LogLevel::kWarning, "cannot record that an entry is done", error);
      FailToRecord(number);
      return;
    }
    plan_.Finish(number);
  }
}

std::optional<Batch::Clock::time_point> Batch::NextWake() const {
  std::optional<Clock::time_point> wake = gate_.NextCheck();
  const bool hasFreeJob = static_cast<int>(children_.size()) < settings_.jobs;
  if (!wake && hasFreeJob) {
    wake = plan_.NextStart();
  }
  for (const auto& child : children_) {
    const auto check = child.second.watch.NextCheck();
    if (check && (!wake || *check < *wake)) {
      wake = check;
    }
  }
  return wake;
}

std::optional<milliseconds> Batch::WaitTime() const {
  // New entries are not reported by every file system.
  constexpr milliseconds kUsualLimit = std::chrono::minutes(1);
  const bool isShown = progress_.IsShown() && !children_.empty();
  const milliseconds limit = isShown ? ProgressLine::kInterval : kUsualLimit;
  const auto wake = NextWake();
  if (!wake) {
    return isShown ? std::make_optional(limit) : std::nullopt;
  }
  const auto left = std::chrono::ceil<milliseconds>(*wake - Clock::now());
  return std::clamp(left, milliseconds(0), limit);
}

/// Of several velathumbs, shows the directory of the one with the lowest number.
void Batch::ShowProgress() const {
  if (children_.empty()) {
    progress_.Hide();
    return;
  }
  const auto& first = *children_.begin();
  progress_.Update(first.first, plan_.Entry(first.second.number));
}

RunEnd Batch::Run() {
  while (!plan_.IsFinished() && !events_.IsStopping() && !failure_) {
    StartEntries();
    if (!failure_) {
      HandBack();
    }
    if (plan_.IsFinished() || failure_) {
      break;
    }
    ShowProgress();
    events_.Wait(WaitTime());
    ReapChildren();
    CheckProgress();
  }
  StopChildren();
  if (failure_) {
    return *failure_;
  }
  return plan_.IsFinished() ? RunEnd::kEmpty : RunEnd::kStopped;
}

}  // namespace vela

// Which entry comes next, and which may be processed at the same time.
#pragma once

#include <chrono>
#include <cstddef>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace vela {

/// The directory or tree that an entry names.
struct EntryTarget {
  std::string directory;  ///< without symbolic links when it exists
  bool isTree = false;    ///< including everything below it
};

/// Returns the target of the queue entry `entry`.
EntryTarget TargetOf(const std::string& entry);

/// Returns whether both include a common directory.
bool DoOverlap(const EntryTarget& a, const EntryTarget& b);

/// Hands out entries in their order, never two that overlap at the same time. Entries that were
/// started before come after those that were not.
class EntryPlan {
 public:
  using Clock = std::chrono::steady_clock;

  explicit EntryPlan(std::vector<std::string> entries);

  /// Returns the first pending entry that is not postponed beyond `now` and overlaps with none that
  /// is in progress; it is then in progress. Nothing when there is none at the moment.
  std::optional<size_t> Start(Clock::time_point now);

  /// Postpones an entry that is not done until `time`.
  void Postpone(size_t number, Clock::time_point time);

  /// Marks an entry as done.
  void Finish(size_t number);

  const std::string& Entry(size_t number) const { return items_[number].entry; }
  bool IsFinished() const { return left_ == 0; }

  /// Returns when the first pending entry may start, a time in the past when one may start now.
  /// Nothing when all wait for entries in progress.
  std::optional<Clock::time_point> NextStart() const;

  /// Returns the entries that are postponed, in their order, when no other ones are left; nothing
  /// when there are other ones.
  std::vector<size_t> OnlyPostponed(Clock::time_point now) const;

 private:
  enum class State { kReady, kWaiting, kPostponed, kInProgress, kDone };
  struct Item {
    std::string entry;
    State state = State::kReady;
    int starts = 0;
    Clock::time_point notBefore;
    std::optional<EntryTarget> target;
    std::vector<size_t> waiting;  ///< while in progress: entries that overlap with this one
  };

  /// The number of starts and that of the entry: the lowest is the next.
  using Rank = std::pair<int, size_t>;

  void WakePostponed(Clock::time_point now);
  void MakeReady(const std::vector<size_t>& numbers);
  void Leave(size_t number);
  Item* FindOverlapping(const EntryTarget& target);

  std::vector<Item> items_;
  std::vector<Rank> ready_;  // the next one at the end
  std::set<std::pair<Clock::time_point, size_t>> postponed_;
  std::vector<size_t> inProgress_;
  size_t left_;
};

}  // namespace vela

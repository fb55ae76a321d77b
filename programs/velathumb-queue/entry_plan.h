// Which entry comes next, and which may be processed at the same time.
#pragma once

#include <chrono>
#include <cstddef>
#include <optional>
#include <string>
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

/// Hands out entries in their order, never two that overlap at the same time.
class EntryPlan {
 public:
  using Clock = std::chrono::steady_clock;

  explicit EntryPlan(std::vector<std::string> entries);

  /// Returns the first pending entry that is not postponed beyond `now` and overlaps with none that
  /// is in progress; it is then in progress. Nothing when there is none at the moment.
  std::optional<size_t> Start(Clock::time_point now);

  /// Postpones an entry that was in progress until `time`.
  void Postpone(size_t number, Clock::time_point time);

  /// Marks an entry that was in progress as done.
  void Finish(size_t number);

  const std::string& Entry(size_t number) const { return items_[number].entry; }
  bool IsFinished() const { return first_ == items_.size(); }

  /// Returns when the first pending entry may start, nothing when none is pending.
  std::optional<Clock::time_point> NextStart() const;

 private:
  enum class State { kPending, kInProgress, kDone };
  struct Item {
    std::string entry;
    State state = State::kPending;
    Clock::time_point notBefore;
    std::optional<EntryTarget> target;
  };
  struct Range {
    size_t begin;
    size_t end;
  };

  Range Window() const;
  bool OverlapsWithProgress(Item& item);

  std::vector<Item> items_;
  std::vector<size_t> inProgress_;
  size_t first_ = 0;  // all entries before it are done
};

}  // namespace vela

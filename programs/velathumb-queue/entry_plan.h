// Which entry comes next, and which may be worked on at the same time.
#pragma once

#include <chrono>
#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace vela {

/// What an entry stands for.
struct EntryTarget {
  std::string directory;  ///< without symbolic links when it exists
  bool isTree = false;    ///< with everything below it
};

/// Returns what the queue entry `entry` stands for.
EntryTarget TargetOf(const std::string& entry);

/// Returns whether both stand for a common directory.
bool DoOverlap(const EntryTarget& a, const EntryTarget& b);

/// Hands out entries in their order, never two that overlap at the same time.
class EntryPlan {
 public:
  using Clock = std::chrono::steady_clock;

  explicit EntryPlan(std::vector<std::string> entries);

  /// Returns the first entry that waits, is not put off beyond `now` and overlaps with none that is
  /// at work; it is then at work. Nothing when there is none at the moment.
  std::optional<size_t> Start(Clock::time_point now);

  /// Puts an entry that was at work off until `time`.
  void PutOff(size_t number, Clock::time_point time);

  /// Notes that an entry that was at work is done.
  void Finish(size_t number);

  const std::string& Entry(size_t number) const { return items_[number].entry; }
  bool IsFinished() const { return first_ == items_.size(); }

  /// Returns when the first of the entries that are put off may start, nothing when none is.
  std::optional<Clock::time_point> NextStart() const;

 private:
  enum class State { kWaiting, kAtWork, kDone };
  struct Item {
    std::string entry;
    State state = State::kWaiting;
    Clock::time_point notBefore;
    std::optional<EntryTarget> target;
  };
  struct Range {
    size_t begin;
    size_t end;
  };

  Range Window() const;
  bool OverlapsWithWork(Item& item);

  std::vector<Item> items_;
  std::vector<size_t> atWork_;
  size_t first_ = 0;  // all before it are done
};

}  // namespace vela

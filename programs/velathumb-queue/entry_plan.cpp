#include "entry_plan.h"

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <filesystem>
#include <functional>
#include <system_error>
#include <utility>

#include "platform/system_rules.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

/// Returns the directory that velathumb reads from a tree entry: without leading colons, up to the
/// next colon.
std::string TreeDirectory(const std::string& entry) {
  const size_t begin = entry.find_first_not_of(':', std::strlen(kTreePrefix));
  return begin == std::string::npos ? "" : entry.substr(begin, entry.find(':', begin) - begin);
}

std::string Canonical(std::string directory) {
  std::error_code error;
  const auto canonical = std::filesystem::canonical(directory, error);
  if (!error) {
    return canonical.string();
  }
  while (directory.size() > 1 && directory.back() == '/') {
    directory.pop_back();
  }
  return directory;
}

bool IsInTree(const std::string& directory, const std::string& root) {
  if (directory.compare(0, root.size(), root) != 0) {
    return false;
  }
  return directory.size() == root.size() || root == "/" || directory[root.size()] == '/';
}

}  // namespace

EntryTarget TargetOf(const std::string& entry) {
  const bool isTree = IsTreeEntry(entry);
  return {Canonical(isTree ? TreeDirectory(entry) : entry), isTree};
}

bool DoOverlap(const EntryTarget& a, const EntryTarget& b) {
  return a.directory == b.directory || (a.isTree && IsInTree(b.directory, a.directory)) ||
         (b.isTree && IsInTree(a.directory, b.directory));
}

EntryPlan::EntryPlan(std::vector<std::string> entries) : left_(entries.size()) {
  items_.resize(entries.size());
  for (size_t number = 0; number < entries.size(); ++number) {
    items_[number].entry = std::move(entries[number]);
    ready_.emplace_back(0, entries.size() - 1 - number);
  }
}

EntryPlan::Item* EntryPlan::FindOverlapping(const EntryTarget& target) {
  const auto other = std::find_if(inProgress_.begin(), inProgress_.end(), [&](size_t number) {
    return DoOverlap(target, *items_[number].target);
  });
  return other == inProgress_.end() ? nullptr : &items_[*other];
}

void EntryPlan::MakeReady(const std::vector<size_t>& numbers) {
  const auto middle = static_cast<std::ptrdiff_t>(ready_.size());
  for (const size_t number : numbers) {
    items_[number].state = State::kReady;
    ready_.emplace_back(items_[number].starts, number);
  }
  std::sort(ready_.begin() + middle, ready_.end(), std::greater<>());
  std::inplace_merge(ready_.begin(), ready_.begin() + middle, ready_.end(), std::greater<>());
}

void EntryPlan::WakePostponed(Clock::time_point now) {
  std::vector<size_t> due;
  while (!postponed_.empty() && postponed_.begin()->first <= now) {
    due.push_back(postponed_.begin()->second);
    postponed_.erase(postponed_.begin());
  }
  MakeReady(due);
}

std::optional<size_t> EntryPlan::Start(Clock::time_point now) {
  WakePostponed(now);
  while (!ready_.empty()) {
    const size_t number = ready_.back().second;
    ready_.pop_back();
    Item& item = items_[number];
    if (!item.target) {
      item.target = TargetOf(item.entry);
    }
    if (Item* other = FindOverlapping(*item.target)) {
      item.state = State::kWaiting;
      other->waiting.push_back(number);
      continue;
    }
    item.state = State::kInProgress;
    ++item.starts;
    inProgress_.push_back(number);
    return number;
  }
  return std::nullopt;
}

/// Removes an entry from the set that it is in.
void EntryPlan::Leave(size_t number) {
  Item& item = items_[number];
  if (item.state == State::kReady) {
    const auto place = std::find(ready_.begin(), ready_.end(), Rank(item.starts, number));
    ready_.erase(place);
  }
  postponed_.erase({item.notBefore, number});
  if (item.state == State::kInProgress) {
    inProgress_.erase(std::find(inProgress_.begin(), inProgress_.end(), number));
    MakeReady(std::exchange(item.waiting, {}));
  }
  // Where the path leads may change.
  item.target.reset();
}

void EntryPlan::Postpone(size_t number, Clock::time_point time) {
  Leave(number);
  items_[number].state = State::kPostponed;
  items_[number].notBefore = time;
  postponed_.emplace(time, number);
}

void EntryPlan::Finish(size_t number) {
  Leave(number);
  items_[number].state = State::kDone;
  --left_;
}

std::optional<EntryPlan::Clock::time_point> EntryPlan::NextStart() const {
  if (!ready_.empty()) {
    return Clock::time_point();
  }
  return postponed_.empty() ? std::nullopt : std::make_optional(postponed_.begin()->first);
}

std::vector<size_t> EntryPlan::OnlyPostponed(Clock::time_point now) const {
  std::vector<size_t> numbers;
  const bool isNoneDue = postponed_.empty() || postponed_.begin()->first > now;
  if (postponed_.size() == left_ && isNoneDue) {
    for (const auto& postponed : postponed_) {
      numbers.push_back(postponed.second);
    }
    std::sort(numbers.begin(), numbers.end());
  }
  return numbers;
}

}  // namespace vela

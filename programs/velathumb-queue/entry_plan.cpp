#include "entry_plan.h"

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <system_error>
#include <utility>

#include "platform/system_rules.h"
#include "storage/creation_queue.h"

namespace vela {

namespace {

/// How many entries are considered, from the first one that is not done.
constexpr size_t kLookAhead = 1000;

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

EntryPlan::EntryPlan(std::vector<std::string> entries) {
  items_.reserve(entries.size());
  for (std::string& entry : entries) {
    items_.push_back({std::move(entry), State::kPending, Clock::time_point(), std::nullopt});
  }
}

EntryPlan::Range EntryPlan::Window() const {
  return {first_, std::min(items_.size(), first_ + kLookAhead)};
}

bool EntryPlan::OverlapsWithProgress(Item& item) {
  if (inProgress_.empty()) {
    return false;
  }
  if (!item.target) {
    item.target = TargetOf(item.entry);
  }
  return std::any_of(inProgress_.begin(), inProgress_.end(),
                     [&](size_t other) { return DoOverlap(*item.target, *items_[other].target); });
}

std::optional<size_t> EntryPlan::Start(Clock::time_point now) {
  const auto [begin, end] = Window();
  for (size_t number = begin; number < end; ++number) {
    Item& item = items_[number];
    if (item.state != State::kPending || item.notBefore > now || OverlapsWithProgress(item)) {
      continue;
    }
    if (!item.target) {
      item.target = TargetOf(item.entry);
    }
    item.state = State::kInProgress;
    inProgress_.push_back(number);
    return number;
  }
  return std::nullopt;
}

void EntryPlan::Postpone(size_t number, Clock::time_point time) {
  inProgress_.erase(std::remove(inProgress_.begin(), inProgress_.end(), number), inProgress_.end());
  items_[number].state = State::kPending;
  items_[number].notBefore = time;
}

void EntryPlan::Finish(size_t number) {
  inProgress_.erase(std::remove(inProgress_.begin(), inProgress_.end(), number), inProgress_.end());
  items_[number].state = State::kDone;
  items_[number].target.reset();
  while (first_ < items_.size() && items_[first_].state == State::kDone) {
    ++first_;
  }
}

std::optional<EntryPlan::Clock::time_point> EntryPlan::NextStart() const {
  std::optional<Clock::time_point> next;
  const auto [begin, end] = Window();
  for (size_t number = begin; number < end; ++number) {
    const Item& item = items_[number];
    if (item.state == State::kPending && (!next || item.notBefore < *next)) {
      next = item.notBefore;
    }
  }
  return next;
}

}  // namespace vela

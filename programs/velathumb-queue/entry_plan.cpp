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

/// How far beyond the first entry that is not done others are looked at.
constexpr size_t kLookAhead = 1000;

/// Returns the directory that velathumb takes from a tree entry: without colons in front of it, and
/// up to the next one.
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
    items_.push_back({std::move(entry), State::kWaiting, Clock::time_point(), std::nullopt});
  }
}

EntryPlan::Range EntryPlan::Window() const {
  return {first_, std::min(items_.size(), first_ + kLookAhead)};
}

bool EntryPlan::OverlapsWithWork(Item& item) {
  if (atWork_.empty()) {
    return false;
  }
  if (!item.target) {
    item.target = TargetOf(item.entry);
  }
  return std::any_of(atWork_.begin(), atWork_.end(),
                     [&](size_t other) { return DoOverlap(*item.target, *items_[other].target); });
}

std::optional<size_t> EntryPlan::Start(Clock::time_point now) {
  const auto [begin, end] = Window();
  for (size_t number = begin; number < end; ++number) {
    Item& item = items_[number];
    if (item.state != State::kWaiting || item.notBefore > now || OverlapsWithWork(item)) {
      continue;
    }
    if (!item.target) {
      item.target = TargetOf(item.entry);
    }
    item.state = State::kAtWork;
    atWork_.push_back(number);
    return number;
  }
  return std::nullopt;
}

void EntryPlan::PutOff(size_t number, Clock::time_point time) {
  atWork_.erase(std::remove(atWork_.begin(), atWork_.end(), number), atWork_.end());
  items_[number].state = State::kWaiting;
  items_[number].notBefore = time;
}

void EntryPlan::Finish(size_t number) {
  atWork_.erase(std::remove(atWork_.begin(), atWork_.end(), number), atWork_.end());
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
    if (item.state == State::kWaiting && (!next || item.notBefore < *next)) {
      next = item.notBefore;
    }
  }
  return next;
}

}  // namespace vela

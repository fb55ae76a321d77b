// Which entries are counted for the totals.
#pragma once

#include <string>
#include <unordered_set>
#include <vector>

#include "entry_plan.h"

/// Sees to it that each directory is counted once, whatever entries stand for it.
class CountedDirectories {
 public:
  explicit CountedDirectories(const std::vector<std::string>& entries);

  /// Returns whether the entry, one of those given above, which stands for `target`, adds anything
  /// to what has been added before.
  bool Add(const std::string& entry, const EntryTarget& target);

 private:
  bool IsBelowTree(const std::string& directory) const;

  std::unordered_set<std::string> trees_;
  std::unordered_set<std::string> counted_;
};

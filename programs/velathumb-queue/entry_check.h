// What is checked before and after velathumb runs: it silently skips what it cannot process, with
// exit status 0.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "entry_plan.h"

namespace vela {

/// Makes the path of an entry from the command line absolute, so that it does not depend on the
/// working directory. Returns an error message, empty when the entry is valid.
std::string CheckAddition(std::string& entry);

/// Returns why the entry cannot be processed now, empty when it can: its directory must exist, and
/// its volume be writable and have enough free space.
std::string FindObstacle(const std::string& entry);

/// The directories of an entry that velathumb would skip.
struct SkippedDirectories {
  /// Another process holds a lock on their metadata directory.
  std::vector<std::string> locked;
  /// On a part of the tree that is mounted read-only: an entry for each part.
  std::vector<std::string> readOnly;
};

/// Searches the directories of the entry. Ends early when `shouldStop` returns true.
SkippedDirectories FindSkippedDirectories(const EntryTarget& target,
                                          const std::function<bool()>& shouldStop = nullptr);

/// Returns the directories of the entry that velathumb would process.
std::vector<std::string> ListDirectories(const EntryTarget& target);

}  // namespace vela

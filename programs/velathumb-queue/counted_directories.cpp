#include "counted_directories.h"

#include <cstddef>
#include <utility>

CountedDirectories::CountedDirectories(const std::vector<std::string>& entries) {
  for (const std::string& entry : entries) {
    EntryTarget target = TargetOf(entry);
    if (target.isTree) {
      trees_.insert(std::move(target.directory));
    }
  }
}

bool CountedDirectories::IsBelowTree(const std::string& directory) const {
  for (size_t slash = directory.rfind('/'); slash != std::string::npos && directory.size() > 1;
       slash = slash == 0 ? std::string::npos : directory.rfind('/', slash - 1)) {
    if (trees_.count(slash == 0 ? "/" : directory.substr(0, slash)) != 0) {
      return true;
    }
  }
  return false;
}

bool CountedDirectories::Add(const std::string& entry, const EntryTarget& target) {
  const bool isInOtherTree =
      IsBelowTree(target.directory) || (!target.isTree && trees_.count(target.directory) != 0);
  // The scan of a tree leaves a directory out that is queued by the very path that it finds there.
  const bool isLeftOut = !target.isTree && entry == target.directory;
  if (isInOtherTree && !isLeftOut) {
    return false;
  }
  return counted_.insert((target.isTree ? "R:" : "") + target.directory).second;
}

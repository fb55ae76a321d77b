// The videos of one directory, subdirectories aside.
#pragma once

#include <functional>
#include <string>

namespace vela {

/// Takes the path of a subdirectory, at its place in the order of listing.
using SubdirectoryVisitor = std::function<void(const std::string& path)>;

/// Checks each video of the directory `dir` (IsVideoWorkNeeded, with what that removes) and
/// stores in `work` how many need work and count. Returns false, logged, when `dir` does not exist
/// or cannot be opened.
bool ReadVideoLevel(const char* dir, const SubdirectoryVisitor& onSubdirectory, int& work);

}  // namespace vela

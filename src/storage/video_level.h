// The videos of one directory, without its subdirectories.
#pragma once

#include <functional>
#include <string>

namespace vela {

/// Takes the path of a subdirectory, called in listing order.
using SubdirectoryVisitor = std::function<void(const std::string& path)>;

/// Checks each video of the directory `dir` with IsVideoWorkNeeded, which may remove files, and
/// stores in `work` the number of those that need work and count. Returns false, logged, when `dir`
/// does not exist or cannot be opened.
bool ReadVideoLevel(const char* dir, const SubdirectoryVisitor& onSubdirectory, int& work);

}  // namespace vela

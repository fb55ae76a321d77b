// The directories of a tree that are indexed.
#pragma once

#include <functional>

namespace vela {

/// Takes the path of a directory, and false when it cannot be opened.
using DirectoryVisitor = std::function<void(const char* path, bool isReadable)>;

/// Calls `visit` for the directory `root` and every directory below it on the same file system
/// whose name is to be indexed, a directory before its subdirectories; trusted links are followed,
/// each directory is visited once. Ends early when `shouldStop`, asked before each visit, returns
/// true. Returns 0, or -1 with errno set when `root` does not exist or a part of the tree could not
/// be read (see WalkTree).
int ForEachIndexedDirectory(const char* root, const DirectoryVisitor& visit,
                            const std::function<bool()>& shouldStop = nullptr);

}  // namespace vela

// Removal of what tests have left behind, mounts included.
#pragma once

#include <string>

namespace vela_test {

/// Takes off whatever is mounted at `path` itself, however often.
void UnmountAll(const std::string& path);

/// Removes a file or tree with whatever is mounted in it; a missing one is no failure.
void RemoveWithMounts(const std::string& path);

/// Removes everything in a directory in that way.
void RemoveContent(const std::string& directory);

}  // namespace vela_test

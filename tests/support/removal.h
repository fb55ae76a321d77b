// Mounts, and the removal of files and mounts that tests have left behind.
#pragma once

#include <cstdint>
#include <string>

namespace vela_test {

/// The number of the mount that `path` is on; 0 when there is no such path.
uint64_t MountAt(const std::string& path);

/// Unmounts everything that is mounted at `path` itself.
void UnmountAll(const std::string& path);

/// Removes a file or tree with everything that is mounted in it; missing ones are ignored.
void RemoveWithMounts(const std::string& path);

/// Removes everything in a directory in that way.
void RemoveContent(const std::string& directory);

}  // namespace vela_test

// Tells mounts apart.
#pragma once

#include <cstdint>
#include <string>

namespace vela_test {

/// The number of the mount that `path` leads into; 0 when there is no such path.
uint64_t MountAt(const std::string& path);

}  // namespace vela_test

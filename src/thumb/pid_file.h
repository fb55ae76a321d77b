// The pid files of running instances, whose names contain the process id.
#pragma once

#include <cstddef>

namespace vela {

/// Size in bytes of the buffer that holds a pid file's path.
inline constexpr std::size_t kPidPathBufferSize = 4095;

/// Matches the pid files of all instances.
inline constexpr char kPidFilePattern[] = "/var/run/velathumb.*.pid";

/// Returns the process id in a pid file's name, 0 when there is none.
long PidOfFile(const char* path);

}  // namespace vela

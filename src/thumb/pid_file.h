// The pid files of running instances: the process id is in the name.
#pragma once

#include <cstddef>

namespace vela {

/// Size in bytes of the buffer that holds a pid file's path.
inline constexpr std::size_t kPidPathBufferSize = 4095;

/// Matches the pid files of all instances.
inline constexpr char kPidFilePattern[] = "/var/run/velathumb.*.pid";

/// Returns the process id that a pid file's name carries, 0 when it carries none.
long PidOfFile(const char* path);

}  // namespace vela

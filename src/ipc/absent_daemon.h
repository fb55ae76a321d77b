// What is known about the index daemon before a program asks it.
#pragma once

#include <cerrno>

namespace vela {

/// Environment variable of a program whose starter has found, and has already logged, that no
/// daemon listens. The program still sends its requests, in case one has come since, but does not
/// log each time that nobody listens. Set by the queue runner only.
inline constexpr char kAbsentDaemonVariable[] = "VELATHUMB_DAEMON_IS_ABSENT";

/// Returns whether a request has failed, with this platform error, because nobody listens.
inline bool IsNobodyListening(int error) {
  return error == ENOENT || error == ECONNREFUSED;
}

}  // namespace vela

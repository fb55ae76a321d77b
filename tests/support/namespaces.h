// The process side of the sandbox: namespaces, and the small process 1 that the sandbox needs.
#pragma once

#include <functional>

namespace vela_test {

/// Moves the program into new mount and process namespaces, as root directly, otherwise through a
/// user namespace in which the caller is user 0. Returns in process 2 of the new process namespace
/// after process 1 has run `prepare` (which mounts the sandbox and ends the process with status 1
/// when it cannot). The calling process never returns: it ends as process 2 does, and so do all
/// processes of the sandbox.
void EnterNamespaces(const std::function<void()>& prepare);

}  // namespace vela_test

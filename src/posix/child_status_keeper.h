// Keeps the kernel from throwing the exit statuses of the tools away.
#pragma once

namespace vela {

/// A process that ignores SIGCHLD, as it may have been told by whoever started it, gets no exit
/// status of its children. Takes that back while a child is out; called once per child.
void KeepChildStatus();

/// The child of a KeepChildStatus is done with; the last one restores what was set before.
void ReleaseChildStatus();

}  // namespace vela

// Keeps the kernel from discarding the exit statuses of child processes.
#pragma once

namespace vela {

/// A process that ignores SIGCHLD, which it can inherit from its parent, gets no exit statuses of
/// its children. Prevents that while a child is running; called once per child.
void KeepChildStatus();

/// Ends the effect of one KeepChildStatus; the last one restores the previous setting.
void ReleaseChildStatus();

}  // namespace vela

// Blocks system calls that making thumbnails does not need.
#pragma once

namespace vela {

/// From now on, no program that is run gains privileges from its file.
void RefuseNewPrivileges();

/// From now on, for this thread and all that it starts, system calls that concern the network,
/// memory of other processes, namespaces, mounts, kernel modules, keys, the clock and the like fail
/// with EPERM, as do those that change file attributes or create links. System calls that this
/// program does not know keep working. Has no effect where the kernel does not support it.
void BlockUnneededSystemCalls();

/// The same for running programs and for signals to other processes, also in threads that exist
/// already; where the kernel does not support that, only in this thread and those that it starts.
void BlockOtherPrograms();

}  // namespace vela

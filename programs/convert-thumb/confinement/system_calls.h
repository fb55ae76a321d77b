// Takes system calls from the process that making thumbnails never needs.
#pragma once

namespace vela {

/// From now on, for this thread and all that it starts, calls that reach the network, other
/// processes' memory, namespaces, mounts, kernel modules, keys, the clock and the like fail with
/// EPERM, as do those that change a file's attributes or make links. Calls that are not known here
/// keep working. Does nothing where the kernel cannot do it.
void RefuseForeignSystemCalls();

/// The same for starting programs and for signals to other processes, also for threads that exist
/// already; where the kernel cannot do that, for this one and all that it starts.
void RefuseOtherPrograms();

}  // namespace vela

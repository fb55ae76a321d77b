// Blocks system calls that reading and writing media files does not need.
#pragma once

namespace vela {

/// The sockets that a confined process may make.
enum class SocketUse {
  kNone,
  kLocalDatagrams,  ///< those through which programs send lines to the system log
};

/// From now on, no program that is run gains privileges from its file. Only makes a system call.
/// Returns 0 or an errno value.
int RefuseNewPrivileges();

/// From now on, for this thread and all that it starts, system calls that concern the network,
/// memory of other processes, namespaces, mounts, kernel modules, keys, the clock and the like fail
/// with EPERM, as do those that change file attributes or create links. Messages can only be sent
/// through a socket that is connected, to the other end of the connection. System calls that this
/// program does not know keep working. Requires RefuseNewPrivileges. Returns 0 or an errno value,
/// ENOSYS or EINVAL when the kernel does not support it.
int BlockUnneededSystemCalls(SocketUse sockets = SocketUse::kNone);

/// Return whether the kernel supports the two.
bool CanRefuseNewPrivileges();
bool CanBlockSystemCalls();

/// After this, BlockUnneededSystemCalls with the same argument only makes system calls.
void PrepareSystemCallFilter(SocketUse sockets = SocketUse::kNone);

/// Blocks running programs and signals to other processes, also in threads that exist already;
/// where the kernel does not support that, only in this thread and those that it starts. Requires
/// RefuseNewPrivileges.
void BlockOtherPrograms();

}  // namespace vela

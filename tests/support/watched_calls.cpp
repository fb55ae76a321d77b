#include "support/watched_calls.h"

#include <sys/syscall.h>

#include <cerrno>

namespace vela_test {

namespace {

using Errors = std::vector<int>;

const Errors kOpening = {ENOSPC, EIO, EMFILE, ENOMEM, EDQUOT, EACCES, EINTR};
const Errors kNaming = {ENOSPC, EIO, ENOMEM, EDQUOT, EACCES};
const Errors kWriting = {ENOSPC, EIO, EDQUOT, EINTR, kShortTransfer};
const Errors kSyncing = {ENOSPC, EIO, EDQUOT, EINTR};
const Errors kReading = {EIO, ENOMEM, EINTR, kShortTransfer};
const Errors kCopying = {ENOSPC, EIO, EDQUOT, EINTR};
const Errors kChanging = {EIO, ENOMEM, EACCES};
const Errors kExamining = {EIO, ENOMEM, EACCES};
const Errors kListing = {EIO, ENOMEM};
const Errors kLocking = {EINTR, ENOLCK};
const Errors kStarting = {ENOMEM, EAGAIN};
const Errors kBecoming = {ENOMEM, EIO, EACCES};
const Errors kNewDescriptor = {EMFILE, ENOMEM};
const Errors kConnecting = {EACCES, EINTR};
const Errors kWaiting = {EINTR};

constexpr int kFchmodat2 = 452;

std::vector<WatchedCall> PathCalls() {
  return {
#ifdef SYS_open
      {SYS_open, "open", 0, -1, kOpening},
      {SYS_mkdir, "mkdir", 0, -1, kNaming},
      {SYS_rename, "rename", 1, -1, kNaming},
      {SYS_link, "link", 1, -1, kNaming},
      {SYS_unlink, "unlink", 0, -1, kChanging},
      {SYS_rmdir, "rmdir", 0, -1, kChanging},
      {SYS_chmod, "chmod", 0, -1, kChanging},
      {SYS_stat, "stat", 0, -1, kExamining},
      {SYS_lstat, "lstat", 0, -1, kExamining},
      {SYS_access, "access", 0, -1, kExamining},
      {SYS_readlink, "readlink", 0, -1, kExamining},
#endif
      {SYS_openat, "openat", 1, -1, kOpening},
      {SYS_openat2, "openat2", 1, -1, kOpening},
      {SYS_mkdirat, "mkdirat", 1, -1, kNaming},
      {SYS_renameat, "renameat", 3, -1, kNaming},
      {SYS_renameat2, "renameat2", 3, -1, kNaming},
      {SYS_linkat, "linkat", 3, -1, kNaming},
      {SYS_unlinkat, "unlinkat", 1, -1, kChanging},
      {SYS_fchmodat, "fchmodat", 1, -1, kChanging},
      {kFchmodat2, "fchmodat2", 1, -1, kChanging},
      {SYS_utimensat, "utimensat", 1, 0, kChanging},
      {SYS_newfstatat, "newfstatat", 1, -1, kExamining},
      {SYS_statx, "statx", 1, -1, kExamining},
      {SYS_faccessat, "faccessat", 1, -1, kExamining},
      {SYS_faccessat2, "faccessat2", 1, -1, kExamining},
      {SYS_readlinkat, "readlinkat", 1, -1, kExamining},
      {SYS_statfs, "statfs", 0, -1, kExamining},
      {SYS_execve, "execve", 0, -1, kBecoming},
  };
}

std::vector<WatchedCall> DescriptorCalls() {
  return {
      {SYS_write, "write", -1, 0, kWriting},
      {SYS_pwrite64, "pwrite64", -1, 0, kWriting},
      {SYS_writev, "writev", -1, 0, kSyncing},
      {SYS_fsync, "fsync", -1, 0, kSyncing},
      {SYS_fdatasync, "fdatasync", -1, 0, kSyncing},
      {SYS_syncfs, "syncfs", -1, 0, kSyncing},
      {SYS_ftruncate, "ftruncate", -1, 0, kSyncing},
      {SYS_fallocate, "fallocate", -1, 0, kSyncing},
      {SYS_read, "read", -1, 0, kReading},
      {SYS_pread64, "pread64", -1, 0, kReading},
      {SYS_readv, "readv", -1, 0, kListing},
      {SYS_getdents64, "getdents64", -1, 0, kListing},
      {SYS_copy_file_range, "copy_file_range", -1, 2, kCopying},
      {SYS_sendfile, "sendfile", -1, 0, kCopying},
      {SYS_splice, "splice", -1, 2, kCopying},
      {SYS_fchmod, "fchmod", -1, 0, kChanging},
      {SYS_fchown, "fchown", -1, 0, kChanging},
      {SYS_fstat, "fstat", -1, 0, kListing},
      {SYS_fstatfs, "fstatfs", -1, 0, kListing},
      {SYS_flock, "flock", -1, 0, kLocking},
      {SYS_connect, "connect", -1, 0, kConnecting},
  };
}

std::vector<WatchedCall> OtherCalls() {
  return {
#ifdef SYS_fork
      {SYS_fork, "fork", -1, -1, kStarting},
      {SYS_vfork, "vfork", -1, -1, kStarting},
      {SYS_pipe, "pipe", -1, -1, kNewDescriptor},
      {SYS_dup2, "dup2", -1, -1, {EMFILE}},
      {SYS_poll, "poll", -1, -1, kWaiting},
      {SYS_epoll_wait, "epoll_wait", -1, -1, kWaiting},
#endif
      {SYS_clone, "clone", -1, -1, kStarting},
      {SYS_clone3, "clone3", -1, -1, kStarting},
      {SYS_pipe2, "pipe2", -1, -1, kNewDescriptor},
      {SYS_dup, "dup", -1, -1, {EMFILE}},
      {SYS_dup3, "dup3", -1, -1, {EMFILE}},
      {SYS_memfd_create, "memfd_create", -1, -1, kNewDescriptor},
      {SYS_pidfd_open, "pidfd_open", -1, -1, kNewDescriptor},
      {SYS_socket, "socket", -1, -1, kNewDescriptor},
      {SYS_socketpair, "socketpair", -1, -1, kNewDescriptor},
      {SYS_ppoll, "ppoll", -1, -1, kWaiting},
      {SYS_epoll_pwait, "epoll_pwait", -1, -1, kWaiting},
      {SYS_wait4, "wait4", -1, -1, kWaiting},
      {SYS_waitid, "waitid", -1, -1, kWaiting},
      {SYS_clock_nanosleep, "clock_nanosleep", -1, -1, kWaiting},
  };
}

}  // namespace

const std::vector<WatchedCall>& WatchedCalls() {
  static const std::vector<WatchedCall> calls = [] {
    std::vector<WatchedCall> all = PathCalls();
    for (const std::vector<WatchedCall>& more : {DescriptorCalls(), OtherCalls()}) {
      all.insert(all.end(), more.begin(), more.end());
    }
    return all;
  }();
  return calls;
}

}  // namespace vela_test

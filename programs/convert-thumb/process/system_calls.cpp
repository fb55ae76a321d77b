#include "process/system_calls.h"

#include <sched.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <initializer_list>

#include <seccomp.h>

namespace vela {

namespace {

constexpr uint32_t kRefuse = SCMP_ACT_ERRNO(EPERM);
/// Makes the C library fall back to the older call, whose flags a filter can examine.
constexpr uint32_t kUnknown = SCMP_ACT_ERRNO(ENOSYS);

/// May be newer than the library; these numbers are the same on all architectures.
constexpr int kPidfdGetfd = 438;
constexpr int kMountSetattr = 442;
constexpr int kFchmodat2 = 452;
constexpr int kSetxattrat = 463;
constexpr int kRemovexattrat = 466;
constexpr int kOpenTreeAttr = 467;
constexpr int kFileSetattr = 469;

constexpr int kNetwork[] = {SCMP_SYS(socket), SCMP_SYS(connect), SCMP_SYS(bind),
                            SCMP_SYS(listen), SCMP_SYS(accept),  SCMP_SYS(accept4)};

constexpr int kOtherProcesses[] = {
// The leak check of a sanitizer needs this.
#if !defined(CONVERT_THUMB_SANITIZED)
    SCMP_SYS(ptrace),
#endif
    SCMP_SYS(process_vm_readv),
    SCMP_SYS(process_vm_writev),
    kPidfdGetfd,
    SCMP_SYS(pidfd_send_signal),
    SCMP_SYS(rt_sigqueueinfo),
    SCMP_SYS(rt_tgsigqueueinfo),
    SCMP_SYS(kcmp)};

constexpr int kSystem[] = {SCMP_SYS(mount),
                           SCMP_SYS(umount),
                           SCMP_SYS(umount2),
                           SCMP_SYS(move_mount),
                           SCMP_SYS(open_tree),
                           kOpenTreeAttr,
                           SCMP_SYS(fsopen),
                           SCMP_SYS(fsmount),
                           SCMP_SYS(fsconfig),
                           SCMP_SYS(fspick),
                           kMountSetattr,
                           SCMP_SYS(pivot_root),
                           SCMP_SYS(chroot),
                           SCMP_SYS(setns),
                           SCMP_SYS(unshare),
                           SCMP_SYS(init_module),
                           SCMP_SYS(finit_module),
                           SCMP_SYS(delete_module),
                           SCMP_SYS(kexec_load),
                           SCMP_SYS(kexec_file_load),
                           SCMP_SYS(reboot),
                           SCMP_SYS(swapon),
                           SCMP_SYS(swapoff),
                           SCMP_SYS(acct),
                           SCMP_SYS(quotactl),
                           SCMP_SYS(syslog),
                           SCMP_SYS(iopl),
                           SCMP_SYS(ioperm),
                           SCMP_SYS(sethostname),
                           SCMP_SYS(setdomainname),
                           SCMP_SYS(settimeofday),
                           SCMP_SYS(clock_settime),
                           SCMP_SYS(clock_adjtime),
                           SCMP_SYS(adjtimex),
                           SCMP_SYS(bpf),
                           SCMP_SYS(perf_event_open),
                           SCMP_SYS(userfaultfd),
                           SCMP_SYS(io_uring_setup),
                           SCMP_SYS(io_uring_enter),
                           SCMP_SYS(io_uring_register),
                           SCMP_SYS(fanotify_init),
                           SCMP_SYS(open_by_handle_at),
                           SCMP_SYS(add_key),
                           SCMP_SYS(request_key),
                           SCMP_SYS(keyctl)};

/// Landlock does not cover these, or not in its first versions.
constexpr int kFileAttributes[] = {
    SCMP_SYS(chmod),        SCMP_SYS(fchmod),    SCMP_SYS(fchmodat),     kFchmodat2,
    SCMP_SYS(chown),        SCMP_SYS(fchown),    SCMP_SYS(lchown),       SCMP_SYS(fchownat),
    SCMP_SYS(utime),        SCMP_SYS(utimes),    SCMP_SYS(futimesat),    SCMP_SYS(utimensat),
    SCMP_SYS(setxattr),     SCMP_SYS(lsetxattr), SCMP_SYS(fsetxattr),    kSetxattrat,
    SCMP_SYS(removexattr),  SCMP_SYS(mknod),     SCMP_SYS(lremovexattr), SCMP_SYS(mknodat),
    SCMP_SYS(fremovexattr), SCMP_SYS(symlink),   kRemovexattrat,         SCMP_SYS(symlinkat),
    kFileSetattr,           SCMP_SYS(link),      SCMP_SYS(linkat),       SCMP_SYS(truncate)};

/// Flags of clone, without that of time namespaces, whose bit belongs to the signal number there.
constexpr uint64_t kNewNamespace[] = {CLONE_NEWNS,   CLONE_NEWCGROUP, CLONE_NEWUTS, CLONE_NEWIPC,
                                      CLONE_NEWUSER, CLONE_NEWPID,    CLONE_NEWNET};

constexpr int kPrograms[] = {SCMP_SYS(execve), SCMP_SYS(execveat)};

/// A seccomp filter that allows every system call without a rule. Rules for system calls that do
/// not exist on this architecture are ignored.
class SystemCallFilter {
 public:
  SystemCallFilter() : context_(seccomp_init(SCMP_ACT_ALLOW)) {}
  ~SystemCallFilter() {
    if (context_ != nullptr) {
      seccomp_release(context_);
    }
  }
  SystemCallFilter(const SystemCallFilter&) = delete;
  SystemCallFilter& operator=(const SystemCallFilter&) = delete;

  template <size_t count>
  void Refuse(const int (&calls)[count]) {
    for (const int call : calls) {
      Add(kRefuse, call);
    }
  }

  void Add(uint32_t action, int call) { Add(action, call, nullptr, 0); }
  void RefuseWhen(int call, scmp_arg_cmp argument) { Add(kRefuse, call, &argument, 1); }

  /// Activates the filter for this thread and all that it starts.
  void Load() {
    if (context_ == nullptr) {
      return;
    }
    SetAttributes();
    seccomp_load(context_);
  }

  /// Activates the filter for all threads, or like Load where that is not possible.
  void LoadForAllThreads() {
    if (context_ == nullptr) {
      return;
    }
    SetAttributes();
    seccomp_attr_set(context_, SCMP_FLTATR_CTL_TSYNC, 1);
    if (seccomp_load(context_) != 0) {
      seccomp_attr_set(context_, SCMP_FLTATR_CTL_TSYNC, 0);
      seccomp_load(context_);
    }
  }

 private:
  void SetAttributes() {
    // Other calling conventions use other system call numbers; no program here uses them.
    seccomp_attr_set(context_, SCMP_FLTATR_ACT_BADARCH, kRefuse);
    // The mitigation would slow down decoding, and this process has no secrets to protect from
    // itself.
    seccomp_attr_set(context_, SCMP_FLTATR_CTL_SSB, 1);
  }

  void Add(uint32_t action, int call, const scmp_arg_cmp* arguments, unsigned count) {
    if (context_ != nullptr) {
      seccomp_rule_add_array(context_, action, call, count, arguments);
    }
  }

  scmp_filter_ctx context_;
};

scmp_arg_cmp Compare(unsigned argument, scmp_compare comparison, uint64_t first,
                     uint64_t second = 0) {
  return {argument, comparison, first, second};
}

}  // namespace

void RefuseNewPrivileges() {
  prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0);
}

void BlockUnneededSystemCalls() {
  SystemCallFilter filter;
  filter.Refuse(kNetwork);
  filter.Refuse(kOtherProcesses);
  filter.Refuse(kSystem);
  filter.Refuse(kFileAttributes);
  // New namespaces would come with new privileges.
  for (const uint64_t flag : kNewNamespace) {
    filter.RefuseWhen(SCMP_SYS(clone), Compare(0, SCMP_CMP_MASKED_EQ, flag, flag));
  }
  filter.Add(kUnknown, SCMP_SYS(clone3));
  // These insert input into the terminal that the program was started from.
  for (const uint64_t request : {TIOCSTI, TIOCLINUX}) {
    filter.RefuseWhen(SCMP_SYS(ioctl), Compare(1, SCMP_CMP_MASKED_EQ, UINT32_MAX, request));
  }
  filter.Load();
}

void BlockOtherPrograms() {
  const auto self = static_cast<uint64_t>(getpid());
  SystemCallFilter filter;
  filter.Refuse(kPrograms);
  for (const int call : {SCMP_SYS(kill), SCMP_SYS(tgkill)}) {
    filter.RefuseWhen(call, Compare(0, SCMP_CMP_NE, self));
  }
  filter.Add(kRefuse, SCMP_SYS(tkill));
  filter.LoadForAllThreads();
}

}  // namespace vela

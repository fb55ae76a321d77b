#include "confinement.h"

#include <fcntl.h>
#include <grp.h>
#include <linux/audit.h>
#include <linux/capability.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <utility>
#include <vector>

#include "posix/confinement.h"
#include "posix/landlock.h"
#include "posix/system_call_filter.h"

namespace vela {

namespace {

/// The user and group without rights, "nobody" and "nogroup".
constexpr uid_t kNobody = 65534;

constexpr uint64_t kMaxMemory = uint64_t{512} << 20;
constexpr uint64_t kMaxProcessorSeconds = 10;
constexpr rlim_t kMaxDescriptors = 8;
[[maybe_unused]] constexpr rlim_t kMaxStack = rlim_t{8} << 20;

#if defined(__x86_64__)
constexpr uint32_t kArchitecture = AUDIT_ARCH_X86_64;
#elif defined(__aarch64__)
constexpr uint32_t kArchitecture = AUDIT_ARCH_AARCH64;
#else
constexpr uint32_t kArchitecture = 0;
#endif

/// Reading descriptors, answering, memory, time, and the end.
constexpr long kAllowedCalls[] = {
    SYS_read,
    SYS_readv,
    SYS_pread64,
    SYS_lseek,
    SYS_recvmsg,
    SYS_write,
    SYS_close,
    SYS_dup,
    SYS_brk,
    SYS_munmap,
    SYS_mremap,
    SYS_madvise,
    SYS_futex,
    SYS_getrandom,
    SYS_clock_gettime,
    SYS_gettimeofday,
    SYS_rt_sigreturn,
    SYS_rt_sigprocmask,
    SYS_exit,
    SYS_exit_group,
    SYS_restart_syscall,
#if defined(SYS_time)
    SYS_time,
#endif
#if defined(VELA_SANITIZED)
    // The sanitizers examine memory through a pipe.
    SYS_pipe2,
    SYS_gettid,
    SYS_getpid,
    SYS_sched_yield,
    SYS_sigaltstack,
    SYS_rt_sigaction,
    SYS_prctl,
    SYS_tgkill,
#endif
};

constexpr sock_filter Instruction(unsigned code, uint32_t operand, unsigned ifTrue = 0,
                                  unsigned ifFalse = 0) {
  return {static_cast<uint16_t>(code), static_cast<uint8_t>(ifTrue), static_cast<uint8_t>(ifFalse),
          operand};
}

constexpr sock_filter kAllow = Instruction(BPF_RET | BPF_K, SECCOMP_RET_ALLOW);
constexpr sock_filter kRefuse = Instruction(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | EPERM);

/// The low 32 bits of an argument.
constexpr sock_filter LoadArgument(unsigned argument) {
  constexpr size_t kLowHalf = __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__ ? 0 : sizeof(uint32_t);
  return Instruction(
      BPF_LD | BPF_W | BPF_ABS,
      static_cast<uint32_t>(offsetof(seccomp_data, args) + argument * sizeof(uint64_t) + kLowHalf));
}

using Filter = std::vector<sock_filter>;

void AllowCall(Filter& filter, long call) {
  filter.push_back(Instruction(BPF_JMP | BPF_JEQ | BPF_K, static_cast<uint32_t>(call), 0, 1));
  filter.push_back(kAllow);
}

/// Allows the call unless one of these bits of an argument is set.
void AllowCallWithout(Filter& filter, long call,
                      const std::vector<std::pair<unsigned, uint32_t>>& bits) {
  const unsigned length = 3 * static_cast<unsigned>(bits.size()) + 1;
  filter.push_back(Instruction(BPF_JMP | BPF_JEQ | BPF_K, static_cast<uint32_t>(call), 0, length));
  for (const auto& [argument, mask] : bits) {
    filter.push_back(LoadArgument(argument));
    filter.push_back(Instruction(BPF_JMP | BPF_JSET | BPF_K, mask, 0, 1));
    filter.push_back(kRefuse);
  }
  filter.push_back(kAllow);
}

/// Allows a call only with this value of an argument.
void AllowCallWith(Filter& filter, long call, unsigned argument, uint32_t value) {
  filter.push_back(Instruction(BPF_JMP | BPF_JEQ | BPF_K, static_cast<uint32_t>(call), 0, 4));
  filter.push_back(LoadArgument(argument));
  filter.push_back(Instruction(BPF_JMP | BPF_JEQ | BPF_K, value, 0, 1));
  filter.push_back(kAllow);
  filter.push_back(kRefuse);
}

Filter MakeFilter() {
  Filter filter = {
      Instruction(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, arch)),
      Instruction(BPF_JMP | BPF_JEQ | BPF_K, kArchitecture, 1, 0),
      kRefuse,
      Instruction(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
  };
  for (const long call : kAllowedCalls) {
    AllowCall(filter, call);
  }
  // Shared memory is not counted as memory of the process.
  AllowCallWithout(filter, SYS_mmap, {{2, PROT_EXEC}, {3, MAP_SHARED}});
  AllowCallWithout(filter, SYS_mprotect, {{2, PROT_EXEC}});
  AllowCallWith(filter, SYS_fcntl, 1, F_GETFL);
  filter.push_back(kRefuse);
  return filter;
}

/// Returns 0 for an error that means that the kernel, or a sandbox around this process, does not
/// support a restriction.
int UnlessUnsupported(int error) {
  const bool isUnsupported =
      error == ENOSYS || error == EOPNOTSUPP || error == EINVAL || error == EPERM;
  return isUnsupported ? 0 : error;
}

int AllowOnlyParsing() {
  if (kArchitecture == 0) {
    return UnlessUnsupported(BlockUnneededSystemCalls());
  }
  Filter filter = MakeFilter();
  const sock_fprog program = {static_cast<unsigned short>(filter.size()), filter.data()};
  return prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0 ? 0 : UnlessUnsupported(errno);
}

int RefuseAllFiles() {
  FileDescriptor ruleset;
  const int error = MakeLandlockRuleset(AllowedFiles(), ruleset);
  if (error != 0 || !ruleset.IsOpen()) {
    return UnlessUnsupported(error);
  }
  return UnlessUnsupported(EnterLandlockRuleset(ruleset.Get()));
}

/// A process without the privilege to change its identity keeps the one that it acts with.
void GiveUpIdentity() {
  if (getuid() == 0 && geteuid() != 0) {
    seteuid(0);
  }
  if (geteuid() == 0) {
    setgroups(0, nullptr);
    setresgid(kNobody, kNobody, kNobody);
    setresuid(kNobody, kNobody, kNobody);
    return;
  }
  setresgid(getegid(), getegid(), getegid());
  setresuid(geteuid(), geteuid(), geteuid());
}

/// Root without the right to change its identity would keep them.
void GiveUpCapabilities() {
  __user_cap_header_struct header = {_LINUX_CAPABILITY_VERSION_3, 0};
  const __user_cap_data_struct none[2] = {};
  syscall(SYS_capset, &header, none);
}

void Limit(__rlimit_resource resource, rlim_t value) {
  rlimit limit = {};
  if (getrlimit(resource, &limit) == 0 && limit.rlim_max > value) {
    limit = {value, value};
    setrlimit(resource, &limit);
  }
}

void LimitResources() {
  ResourceLimits limits;
  limits.memory = kMaxMemory;
  limits.processorSeconds = kMaxProcessorSeconds;
  limits.fileSize = 0;
  LowerLimits(limits);
#if !defined(VELA_SANITIZED)
  Limit(RLIMIT_STACK, kMaxStack);
#endif
  DisableCoreDumps();
}

}  // namespace

int EnterConfinement() {
  int error = UnlessUnsupported(RefuseNewPrivileges());
  LimitResources();
  GiveUpIdentity();
  GiveUpCapabilities();
  // A change of the identity cancels this.
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  if (error == 0) {
    error = RefuseAllFiles();
  }
  Limit(RLIMIT_NOFILE, kMaxDescriptors);
  return error == 0 ? AllowOnlyParsing() : error;
}

}  // namespace vela

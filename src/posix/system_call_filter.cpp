#include "posix/system_call_filter.h"

#include <linux/audit.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <utility>
#include <vector>

// Only for the numbers of the system calls: loading the library and making a filter with it takes
// longer than everything else that starting a tool needs.
#include <seccomp.h>

namespace vela {

namespace {

#if defined(__x86_64__)
constexpr uint32_t kArchitecture = AUDIT_ARCH_X86_64;
#elif defined(__i386__)
constexpr uint32_t kArchitecture = AUDIT_ARCH_I386;
#elif defined(__aarch64__) && defined(__AARCH64EL__)
constexpr uint32_t kArchitecture = AUDIT_ARCH_AARCH64;
#elif defined(__arm__) && defined(__ARMEL__)
constexpr uint32_t kArchitecture = AUDIT_ARCH_ARM;
#elif defined(__riscv) && __riscv_xlen == 64
constexpr uint32_t kArchitecture = AUDIT_ARCH_RISCV64;
#elif defined(__powerpc64__) && defined(__LITTLE_ENDIAN__)
constexpr uint32_t kArchitecture = AUDIT_ARCH_PPC64LE;
#else
#error "add the constant of this architecture from linux/audit.h"
#endif

constexpr uint32_t kRefuse = SECCOMP_RET_ERRNO | EPERM;
/// Makes the C library fall back to the older call, whose flags a filter can examine.
constexpr uint32_t kUnknown = SECCOMP_RET_ERRNO | ENOSYS;

/// The other calling convention of x86-64 marks its system calls with this bit.
constexpr uint32_t kX32Bit = 0x40000000;

/// May be newer than the header; these numbers are the same on all architectures.
constexpr int kPidfdGetfd = 438;
constexpr int kMountSetattr = 442;
constexpr int kFchmodat2 = 452;
constexpr int kSetxattrat = 463;
constexpr int kRemovexattrat = 466;
constexpr int kOpenTreeAttr = 467;
constexpr int kFileSetattr = 469;

// Some machines have one call for all of them. The last two could send a message to a socket that
// is not the other end of a connection.
constexpr int kNetwork[] = {SCMP_SYS(socketcall), SCMP_SYS(bind),    SCMP_SYS(listen),
                            SCMP_SYS(accept),     SCMP_SYS(accept4), SCMP_SYS(sendmsg),
                            SCMP_SYS(sendmmsg)};

constexpr int kConnecting[] = {SCMP_SYS(socket), SCMP_SYS(connect)};

/// The bits of a socket's type without its flags.
constexpr uint32_t kSocketTypeMask = 0xf;

constexpr int kOtherProcesses[] = {
// The leak check of a sanitizer needs this.
#if !defined(VELA_SANITIZED)
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
constexpr uint32_t kNewNamespace[] = {CLONE_NEWNS,   CLONE_NEWCGROUP, CLONE_NEWUTS, CLONE_NEWIPC,
                                      CLONE_NEWUSER, CLONE_NEWPID,    CLONE_NEWNET};

constexpr int kPrograms[] = {SCMP_SYS(execve), SCMP_SYS(execveat)};

/// Instructions for the kernel. A jump skips as many of the following ones as it says.
using Code = std::vector<sock_filter>;

sock_filter Instruction(unsigned code, uint32_t operand, unsigned ifTrue = 0,
                        unsigned ifFalse = 0) {
  return {static_cast<uint16_t>(code), static_cast<uint8_t>(ifTrue), static_cast<uint8_t>(ifFalse),
          operand};
}

sock_filter Load(size_t offset) {
  return Instruction(BPF_LD | BPF_W | BPF_ABS, static_cast<uint32_t>(offset));
}

sock_filter Return(uint32_t action) {
  return Instruction(BPF_RET | BPF_K, action);
}

/// Refuses a call by the low 32 bits of an argument.
struct ArgumentTest {
  unsigned argument;
  uint32_t mask;
  uint32_t value;
  bool refusesEqual;  ///< refuses the value, not all others
};

/// What to do with the system calls from this number to the next rule.
struct Rule {
  uint32_t first;
  uint32_t action;  ///< if no test refuses the call
  std::vector<ArgumentTest> tests;
};

/// A filter that allows every system call without a rule. Rules for system calls that do not exist
/// on this architecture are ignored.
class FilterProgram {
 public:
  template <size_t count>
  void Refuse(const int (&calls)[count]) {
    for (const int call : calls) {
      Always(kRefuse, call);
    }
  }

  void Always(uint32_t action, int call) { Add(call, action, {}); }

  void RefuseWhen(int call, std::vector<ArgumentTest> tests) {
    Add(call, SECCOMP_RET_ALLOW, std::move(tests));
  }

  Code Finish() {
    // Other calling conventions use other system call numbers; no program here uses them.
    Code code = {Load(offsetof(seccomp_data, arch)),
                 Instruction(BPF_JMP | BPF_JEQ | BPF_K, kArchitecture, 1, 0), Return(kRefuse),
                 Load(offsetof(seccomp_data, nr))};
    const std::vector<Rule> ranges = Ranges();
    AppendSearch(ranges.data(), ranges.data() + ranges.size(), code);
    return code;
  }

 private:
  void Add(int call, uint32_t action, std::vector<ArgumentTest> tests) {
    if (call >= 0) {
      rules_.push_back({static_cast<uint32_t>(call), action, std::move(tests)});
    }
  }

  /// Returns rules for all numbers, in their order.
  std::vector<Rule> Ranges() {
    std::sort(rules_.begin(), rules_.end(),
              [](const Rule& a, const Rule& b) { return a.first < b.first; });
    std::vector<Rule> ranges;
    uint32_t next = 0;
    for (const Rule& rule : rules_) {
      if (rule.first > next) {
        AddRange(ranges, {next, SECCOMP_RET_ALLOW, {}});
      }
      AddRange(ranges, rule);
      next = rule.first + 1;
    }
    AddRange(ranges, {next, SECCOMP_RET_ALLOW, {}});
#if defined(__x86_64__)
    AddRange(ranges, {kX32Bit, kRefuse, {}});
#endif
    return ranges;
  }

  /// Extends the last range instead when it does the same.
  static void AddRange(std::vector<Rule>& ranges, const Rule& range) {
    const bool isSame = !ranges.empty() && ranges.back().action == range.action &&
                        ranges.back().tests.empty() && range.tests.empty();
    if (!isSame) {
      ranges.push_back(range);
    }
  }

  /// The kernel runs a new filter for every system call there is, so starting a program would take
  /// noticeably longer with a list that is searched from its beginning.
  static void AppendSearch(const Rule* begin, const Rule* end, Code& code) {
    if (end - begin == 1) {
      AppendRule(*begin, code);
      return;
    }
    const Rule* const middle = begin + (end - begin) / 2;
    code.push_back(Instruction(BPF_JMP | BPF_JGE | BPF_K, middle->first, 0, 1));
    // A conditional jump reaches only 255 instructions.
    code.push_back(Instruction(BPF_JMP | BPF_JA, 0));
    const size_t lower = code.size();
    AppendSearch(begin, middle, code);
    code[lower - 1].k = static_cast<uint32_t>(code.size() - lower);
    AppendSearch(middle, end, code);
  }

  static void AppendRule(const Rule& rule, Code& code) {
    constexpr size_t kLowHalf = __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__ ? 0 : sizeof(uint32_t);
    for (const ArgumentTest& test : rule.tests) {
      const unsigned skip = test.refusesEqual ? 1 : 0;
      code.push_back(
          Load(offsetof(seccomp_data, args) + test.argument * sizeof(uint64_t) + kLowHalf));
      code.push_back(Instruction(BPF_ALU | BPF_AND | BPF_K, test.mask));
      code.push_back(Instruction(BPF_JMP | BPF_JEQ | BPF_K, test.value, 1 - skip, skip));
      code.push_back(Return(kRefuse));
    }
    code.push_back(Return(rule.action));
  }

  std::vector<Rule> rules_;
};

void RefuseNetwork(SocketUse sockets, FilterProgram& program) {
  program.Refuse(kNetwork);
  // With an address of no bytes, a message goes to the other end of the connection.
  program.RefuseWhen(SCMP_SYS(sendto), {{5, UINT32_MAX, 0, false}});
  if (sockets == SocketUse::kNone) {
    program.Refuse(kConnecting);
    return;
  }
  program.RefuseWhen(SCMP_SYS(socket),
                     {{0, UINT32_MAX, AF_UNIX, false}, {1, kSocketTypeMask, SOCK_DGRAM, false}});
}

Code MakeFilterOfUnneededCalls(SocketUse sockets) {
  FilterProgram program;
  RefuseNetwork(sockets, program);
  program.Refuse(kOtherProcesses);
  program.Refuse(kSystem);
  program.Refuse(kFileAttributes);
  // New namespaces would come with new privileges.
  std::vector<ArgumentTest> namespaces;
  for (const uint32_t flag : kNewNamespace) {
    namespaces.push_back({0, flag, flag, true});
  }
  program.RefuseWhen(SCMP_SYS(clone), namespaces);
  program.Always(kUnknown, SCMP_SYS(clone3));
  // These insert input into the terminal that the program was started from.
  program.RefuseWhen(SCMP_SYS(ioctl),
                     {{1, UINT32_MAX, TIOCSTI, true}, {1, UINT32_MAX, TIOCLINUX, true}});
  return program.Finish();
}

/// Never destroyed: threads may still start tools while the program ends.
const Code& FilterOfUnneededCalls(SocketUse sockets) {
  if (sockets == SocketUse::kLocalDatagrams) {
    static const auto* const filter = new Code(MakeFilterOfUnneededCalls(sockets));
    return *filter;
  }
  static const auto* const filter = new Code(MakeFilterOfUnneededCalls(sockets));
  return *filter;
}

/// Returns what the system call returns: 0, -1 with errno set, or the id of a thread.
long Install(const Code& filter, unsigned flags) {
  sock_fprog program = {static_cast<unsigned short>(filter.size()),
                        const_cast<sock_filter*>(filter.data())};
  return syscall(SYS_seccomp, SECCOMP_SET_MODE_FILTER, flags, &program);
}

/// Activates a filter. Returns 0 or an errno value. Only makes system calls.
int Activate(const Code& filter) {
  // The mitigation would slow down decoding, and a confined process has no secrets to protect from
  // itself.
  if (Install(filter, SECCOMP_FILTER_FLAG_SPEC_ALLOW) == 0) {
    return 0;
  }
  // The flag is newer than filters.
  return errno == EINVAL && Install(filter, 0) == 0 ? 0 : errno;
}

}  // namespace

int RefuseNewPrivileges() {
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 ? 0 : errno;
}

bool CanRefuseNewPrivileges() {
  return prctl(PR_GET_NO_NEW_PRIVS, 0, 0, 0, 0) >= 0;
}

bool CanBlockSystemCalls() {
  // A missing filter is noticed only where filters are supported.
  return syscall(SYS_seccomp, SECCOMP_SET_MODE_FILTER, 0, nullptr) < 0 && errno == EFAULT;
}

void PrepareSystemCallFilter(SocketUse sockets) {
  FilterOfUnneededCalls(sockets);
}

int BlockUnneededSystemCalls(SocketUse sockets) {
  return Activate(FilterOfUnneededCalls(sockets));
}

void BlockOtherPrograms() {
  const auto self = static_cast<uint32_t>(getpid());
  FilterProgram program;
  program.Refuse(kPrograms);
  for (const int call : {SCMP_SYS(kill), SCMP_SYS(tgkill)}) {
    program.RefuseWhen(call, {{0, UINT32_MAX, self, false}});
  }
  program.Always(kRefuse, SCMP_SYS(tkill));
  const Code filter = program.Finish();
  if (Install(filter, SECCOMP_FILTER_FLAG_TSYNC | SECCOMP_FILTER_FLAG_SPEC_ALLOW) != 0 &&
      Install(filter, SECCOMP_FILTER_FLAG_TSYNC) != 0) {
    Activate(filter);
  }
}

}  // namespace vela

#include "support/seccomp_fail.h"

#include <fcntl.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>

#include <cerrno>
#include <cstddef>
#include <memory>

#include "support/filter_instruction.h"

namespace vela_test {

namespace {

sock_filter Load(size_t offset) {
  return Instruction(BPF_LD | BPF_W | BPF_ABS, static_cast<uint32_t>(offset));
}

/// Continues with the next instruction when equal, else skips `otherwise` of them.
sock_filter WhenEqual(uint32_t value, int otherwise) {
  return Instruction(BPF_JMP | BPF_JEQ | BPF_K, value, 0, otherwise);
}

sock_filter Return(uint32_t action) {
  return Instruction(BPF_RET | BPF_K, action);
}

void AddRule(const RefusedCall& call, Filter* filter) {
  const bool isConditional = call.argument >= 0;
  filter->push_back(Load(offsetof(seccomp_data, nr)));
  filter->push_back(WhenEqual(static_cast<uint32_t>(call.number), isConditional ? 4 : 1));
  if (isConditional) {
    // The low half of the argument comes first on both machines.
    filter->push_back(Load(offsetof(seccomp_data, args) + sizeof(uint64_t) * call.argument));
    filter->push_back(Instruction(BPF_ALU | BPF_AND | BPF_K, call.mask));
    filter->push_back(WhenEqual(call.value, 1));
  }
  filter->push_back(Return(SECCOMP_RET_ERRNO | (static_cast<uint32_t>(call.error) & 0xffff)));
}

Filter FilterFor(const std::vector<RefusedCall>& calls) {
  Filter filter = {Load(offsetof(seccomp_data, arch)), WhenEqual(kArchitecture, 0)};
  for (const RefusedCall& call : calls) {
    AddRule(call, &filter);
  }
  filter.push_back(Return(SECCOMP_RET_ALLOW));
  return filter;
}

int Install(Filter* filter) {
  const sock_fprog program = {static_cast<unsigned short>(filter->size()), filter->data()};
  // Without this an ordinary user may not install a filter.
  if (prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) != 0) {
    return errno;
  }
  return prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0 ? 0 : errno;
}

}  // namespace

BeforeExec SeccompFail(const std::vector<RefusedCall>& calls) {
  const auto filter = std::make_shared<Filter>(FilterFor(calls));
  return [filter] { return Install(filter.get()); };
}

BeforeExec SeccompFail(const std::vector<int>& numbers, int error) {
  std::vector<RefusedCall> calls;
  calls.reserve(numbers.size());
  for (const int number : numbers) {
    calls.push_back({number, error});
  }
  return SeccompFail(calls);
}

std::vector<int> ChmodCalls() {
  constexpr int kFchmodat2 = 452;
  return {
#ifdef SYS_chmod
      SYS_chmod,
#endif
      SYS_fchmod, SYS_fchmodat, kFchmodat2};
}

std::vector<int> RenameCalls() {
  return {
#ifdef SYS_rename
      SYS_rename,
#endif
      SYS_renameat, SYS_renameat2};
}

std::vector<int> MkdirCalls() {
  return {
#ifdef SYS_mkdir
      SYS_mkdir,
#endif
      SYS_mkdirat};
}

std::vector<int> FlockCalls() {
  return {SYS_flock};
}

std::vector<int> ForkCalls() {
  return {
#ifdef SYS_fork
      SYS_fork, SYS_vfork,
#endif
      SYS_clone, SYS_clone3};
}

std::vector<RefusedCall> OpensWithFlags(int flags, int error) {
  const uint32_t bits = static_cast<uint32_t>(flags);
  return {
#ifdef SYS_open
      {SYS_open, error, 1, bits, bits},
#endif
      {SYS_openat, error, 2, bits, bits}};
}

}  // namespace vela_test

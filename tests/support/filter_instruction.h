// The instructions of a filter of system calls.
#pragma once

#include <linux/audit.h>
#include <linux/filter.h>

#include <cstdint>
#include <vector>

namespace vela_test {

#if defined(__x86_64__)
inline constexpr uint32_t kArchitecture = AUDIT_ARCH_X86_64;
#elif defined(__aarch64__)
inline constexpr uint32_t kArchitecture = AUDIT_ARCH_AARCH64;
#else
#error "the filter does not know this machine's system call numbers"
#endif

using Filter = std::vector<sock_filter>;

inline sock_filter Instruction(int code, uint32_t operand, int ifTrue = 0, int ifFalse = 0) {
  return {static_cast<uint16_t>(code), static_cast<uint8_t>(ifTrue), static_cast<uint8_t>(ifFalse),
          operand};
}

}  // namespace vela_test

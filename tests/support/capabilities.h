// The calling thread's capabilities, with plain system calls.
#pragma once

#include <cstdint>

namespace vela_test {

/// The effective set, one bit a capability; sets `ok` to whether it could be read.
uint64_t EffectiveCapabilities(bool* ok);

/// Replaces the effective set; the permitted set stays. Async-signal-safe. 0, or an errno.
int SetEffectiveCapabilities(uint64_t effective);

/// Empties all sets permanently. Async-signal-safe. 0, or an errno.
int GiveUpCapabilities();

}  // namespace vela_test

// Settings of this process that a service makes when it starts.
#pragma once

#include <cstdint>
#include <initializer_list>

namespace vela {

/// Raises the limit of open files to `wanted`, as far as permitted. Returns the limit that is then
/// in effect, `wanted` when it is unknown.
uint64_t RaiseOpenFileLimit(uint64_t wanted);

/// Blocks the signals in the calling thread and in all threads that it starts.
void BlockSignals(std::initializer_list<int> signals);

/// Makes a write to a closed pipe or socket fail instead of ending the process.
void IgnoreBrokenPipes();

}  // namespace vela

// Limits on the memory and processor time of a conversion.
#pragma once

#include <cstddef>

namespace vela {

/// Processor time of all threads together; enough for a picture of 100 megapixels on a slow
/// machine.
constexpr unsigned kMaxProcessorSeconds = 600;

/// Memory of the program and its libraries besides the picture, in bytes, and a thread stack for
/// each processor, since libraries start that many threads.
constexpr size_t kBaseMemory = size_t{64} << 20;
constexpr size_t kStackMemory = size_t{8} << 20;

/// Returns the memory limit of a conversion in bytes: `convert_memory_limit` of the system
/// settings, a number that a suffix K, M or G multiplies by 1024, 1024^2 or 1024^3. If it is absent
/// or empty, the default of the build (VELA_CONVERT_MEMORY_LIMIT); the same, after one line on
/// standard error, if it is invalid.
size_t ConversionMemoryLimit();

/// From now on, allocations fail when this process, or the program that replaces it, has used
/// `memoryLimit` bytes plus the above, and it gets SIGXCPU when its processor time is used up.
/// Existing lower limits stay.
void LimitResources(size_t memoryLimit);

/// Returns true when the memory suffices for the stacks of threads too: false when the limit that
/// the process was started with is lower than that of LimitResources.
bool HasMemoryForThreads(size_t memoryLimit);

}  // namespace vela

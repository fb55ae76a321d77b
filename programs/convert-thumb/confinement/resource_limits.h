// Keeps the kernel from giving the process more than a conversion is worth.
#pragma once

#include <cstddef>

namespace vela {

/// Processor time of all threads together; more than a picture of 100 megapixels takes on a slow
/// machine.
constexpr unsigned kMostProcessorSeconds = 600;

/// What the program and its libraries take besides the picture, in bytes. To it comes a stack for
/// every processor, since libraries start that many threads.
constexpr size_t kMemoryBesides = size_t{64} << 20;
constexpr size_t kStackMemory = size_t{8} << 20;

/// From now on requests for memory fail when the process, or the program that takes over, has
/// `memoryLimit` bytes besides the above, and it gets SIGXCPU when its processor time is used up.
/// Lower limits that are in force stay.
void LimitResources(size_t memoryLimit);

}  // namespace vela

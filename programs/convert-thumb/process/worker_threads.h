// Parallel work on the available processors.
#pragma once

#include <cstddef>
#include <functional>

namespace vela {

/// Returns the number of processors that this process may use.
size_t ProcessorCount();

/// Returns true when this process may use more than one processor.
bool HasSecondProcessor();

/// Calls `work` with every number below `count`, in two threads if there is a second processor;
/// each thread takes the next remaining number. Stops and returns false when a call returns false.
bool DoInTwoThreads(size_t count, const std::function<bool(size_t)>& work);

}  // namespace vela

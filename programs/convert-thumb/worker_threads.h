// How much is done at the same time.
#pragma once

#include <cstddef>
#include <functional>

namespace vela {

/// Whether this process may use more than one processor.
bool HasSecondProcessor();

/// Calls `work` with every number below `count`, by two threads where there is a second processor:
/// each takes the next number that nobody has taken. False as soon as a call has returned false;
/// what nobody has taken by then is left out.
bool DoInTwoThreads(size_t count, const std::function<bool(size_t)>& work);

}  // namespace vela

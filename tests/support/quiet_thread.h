// Threads of the test support itself.
#pragma once

#include <functional>
#include <thread>

namespace vela_test {

/// Starts a thread with all signals blocked: signals are for the code under test, which runs on the
/// main thread.
std::thread StartQuietThread(std::function<void()> body);

}  // namespace vela_test

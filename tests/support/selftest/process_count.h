// The processes that the sandbox of a test program consists of, seen from the outside.
#pragma once

#include <chrono>
#include <string>
#include <thread>

#include "support/files.h"

namespace vela_test {

/// The program, its process 1 and its test process.
constexpr size_t kProcessesOfASandbox = 3;

inline size_t ProcessCount() {
  size_t count = 0;
  for (const std::string& name : ListDirectory("/proc")) {
    count += name.find_first_not_of("0123456789") == std::string::npos ? 1 : 0;
  }
  return count;
}

/// Waits at most ten seconds; returns whether there are `count` processes.
inline bool AwaitProcessCount(size_t count) {
  constexpr int kMilliseconds = 10000;
  for (int i = 0; i < kMilliseconds && ProcessCount() != count; ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  return ProcessCount() == count;
}

}  // namespace vela_test

// The steps of a stub that deal with processes, signals and time.
#pragma once

#include <string>
#include <vector>

namespace vela_test {

/// Runs a program and waits for it; its exit status, 128 + n after signal n, 127 when it cannot be
/// started. The program ends with the stub.
int RunAndWait(const std::string& program, const std::vector<std::string>& arguments);

void SleepFor(int milliseconds);

/// Waits until the path exists; false when it does not come within 60 s.
bool AwaitFile(const std::string& path);

/// Ends by the signal, whatever its disposition was.
[[noreturn]] void Die(int signal);

}  // namespace vela_test

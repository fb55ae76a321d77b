// The steps of a stub. Functions on files return 0 or an errno value.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <string>
#include <vector>

namespace vela_test {

/// Writes the whole content to a descriptor.
int WriteWhole(int descriptor, const std::string& content);

int WriteContent(const std::string& path, const std::string& content);
int AppendBytes(const std::string& path, size_t bytes);
/// Grows the size by a hole; the allocated blocks do not change.
int GrowSize(const std::string& path, size_t bytes);
/// Allocates space after the end; the size does not change.
int GrowBlocks(const std::string& path, size_t bytes);
int RemoveWhole(const std::string& path);
int ReplaceWithDirectory(const std::string& path);
int SetBothTimes(const std::string& path, long long seconds);
/// Shrinks a memory volume to the used space.
int FillUp(const std::string& path);

/// Runs a program and waits for it; its exit status, 128 + n after signal n, 127 when it cannot be
/// started. The program ends with the stub.
int RunAndWait(const std::string& program, const std::vector<std::string>& arguments);

void SleepFor(int milliseconds);

/// Waits until the path exists; false when it does not within 60 s.
bool AwaitFile(const std::string& path);

/// Ends the process by the signal, even if that is blocked or ignored.
[[noreturn]] void Die(int signal);

}  // namespace vela_test

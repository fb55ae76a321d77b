// The steps of a stub that change files. Each returns 0, or the errno that stopped it.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <string>

namespace vela_test {

/// Writes the whole content to a descriptor.
int WriteWhole(int descriptor, const std::string& content);

int WriteContent(const std::string& path, const std::string& content);
int AppendBytes(const std::string& path, size_t bytes);
/// The size grows by a hole, the allocated blocks stay.
int GrowSize(const std::string& path, size_t bytes);
/// Space is allocated behind the end, the size stays.
int GrowBlocks(const std::string& path, size_t bytes);
int RemoveWhole(const std::string& path);
int ReplaceWithDirectory(const std::string& path);
int SetBothTimes(const std::string& path, long long seconds);
/// Shrinks a memory volume to what is in use.
int FillUp(const std::string& path);

}  // namespace vela_test

// Restricts changes to files with the kernel's Landlock.
#pragma once

#include <string>
#include <vector>

namespace vela {

/// The paths that a run may write to. They need not exist.
struct WritablePaths {
  std::vector<std::string> directories;  ///< including everything below them
  std::vector<std::string> files;        ///< existing outputs; symbolic links are followed
};

/// From now on this thread, and all threads and programs that it starts, can write, create,
/// truncate and remove regular files only at `paths`; it cannot create other kinds of files, use
/// TCP, or send signals to processes that were started earlier. Restrictions that the kernel does
/// not support and paths that do not exist are skipped. Open descriptors are not affected. Requires
/// RefuseNewPrivileges.
void RestrictWritingTo(const WritablePaths& paths);

}  // namespace vela

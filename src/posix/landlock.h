// Restricts access to files with the kernel's Landlock.
#pragma once

#include <string>
#include <vector>

#include "posix/file_descriptor.h"

namespace vela {

/// The paths that a process may write to. They need not exist.
struct WritablePaths {
  std::vector<std::string> directories;  ///< including everything below them
  std::vector<std::string> files;        ///< existing outputs; symbolic links are followed
};

/// The only files that a process may open. A directory stands for everything below it. Paths that
/// do not exist are skipped. In the paths of inputs and outputs, which ordinary users control, a
/// symbolic link is followed only if it belongs to root, the effective user or the owner of the
/// file that it leads to; otherwise the path is skipped. Each path is looked up once, when the
/// ruleset is made: a file that replaces it later is out of reach.
struct AllowedFiles {
  std::vector<std::string> programs;  ///< may be read and run; parts of the system
  std::vector<std::string> data;      ///< may be read; parts of the system
  std::vector<std::string> devices;   ///< may be read and written; parts of the system
  std::vector<std::string> inputs;    ///< may be read
  std::vector<std::string> outputs;   ///< directories whose files may be read, written, removed
};

/// Returns the kernel's Landlock version, 0 when it does not support Landlock.
int LandlockVersion();

/// Returns what a Landlock ruleset of this version covers, in a few words each.
std::vector<std::string> LandlockCoverage(int version);

/// Stores a ruleset that allows exactly `files` and, where the kernel's version supports it,
/// refuses TCP, device control, and signals and abstract sockets to processes outside. Stores no
/// open descriptor when the kernel does not support Landlock. Returns 0 or an errno value.
int MakeLandlockRuleset(const AllowedFiles& files, FileDescriptor& ruleset);

/// Restricts this thread, and all threads and programs that it starts, to a ruleset. Open
/// descriptors are not affected. Requires RefuseNewPrivileges. Only makes a system call. Returns 0
/// or an errno value.
int EnterLandlockRuleset(int ruleset);

/// From now on this thread, and all threads and programs that it starts, can write, create,
/// truncate and remove regular files only at `paths`; it cannot create other kinds of files, use
/// TCP, or send signals to processes that were started earlier. Restrictions that the kernel does
/// not support and paths that do not exist are skipped. Open descriptors are not affected. Requires
/// RefuseNewPrivileges.
void RestrictWritingTo(const WritablePaths& paths);

}  // namespace vela

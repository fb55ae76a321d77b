// Drops privileges that the process does not need, before it reads a photo.
#pragma once

#include "posix/landlock.h"

namespace vela {

/// From now on this process, and any program that replaces it, cannot gain privileges, leaves no
/// core dump, changes files only at `paths`, and cannot make system calls that making thumbnails
/// does not need. Called while there is one thread. Restrictions that the kernel does not support
/// are skipped.
void Confine(const WritablePaths& paths);

/// From now on no thread, including those that libraries have started, can replace this process or
/// start another program. Called after Confine.
void ConfineToThisProgram();

}  // namespace vela

// Drops privileges that the process does not need, before it reads a photo.
#pragma once

#include "posix/landlock.h"

namespace vela {

/// From now on this process, and any program that it starts, cannot gain privileges, leaves no core
/// dump, accesses only `files`, and cannot make system calls that making thumbnails does not need.
/// Called while there is one thread. Restrictions that the kernel does not support are skipped.
/// Returns 0, or the errno value of a restriction that is supported and failed.
int Confine(const AllowedFiles& files);

/// From now on no thread, including those that libraries have started, can replace this process or
/// start another program. Called after Confine.
void ConfineToThisProgram();

}  // namespace vela

// This process and others.
#pragma once

#include <sys/types.h>

namespace vela {

/// What the system says about a process id.
enum class ProcessState {
  kRunning,
  kInaccessible,  ///< there is a process, and this one may not signal it
  kGone,
};

/// Returns the state of the process `pid`, kGone for a number that no process can have.
ProcessState StateOfProcess(long pid);

/// Opens /dev/null for each standard descriptor that is closed, so that no file opened later gets
/// its number.
void HoldStandardDescriptors();

/// From now on files get exactly the modes that they are created with.
void CreateFilesWithExactModes();

}  // namespace vela

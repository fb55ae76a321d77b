// The files that a run creates; removed when it fails.
#pragma once

#include <string>

#include "posix/file_descriptor.h"

namespace vela {

/// Creates a file in a directory, where it must not exist yet, also not as a symbolic link, with
/// these permission bits reduced by the file creation mask, and opens it for writing. Records it as
/// an output of this run. No open descriptor, with errno set, on failure, or when the run is
/// already ending. May be called by any thread.
FileDescriptor CreateOutput(const FileDescriptor& directory, const std::string& name,
                            unsigned mode);

/// Removes this output because it is incomplete, unless its name refers to another file by now. May
/// be called by any thread.
void RemoveOutput(const FileDescriptor& output);

/// Waits until the content of all outputs is on the disk. Returns false, after a call of
/// ReportFailure, when that fails.
bool SyncOutputs();

/// Removes all outputs, except those whose names refer to other files by now. From then on the run
/// counts as ending.
void RemoveOutputs();

/// From now on, signals after which the run cannot continue (out of memory in a library, a source
/// that shrinks while it is being read, processor time used up, a crash) remove the outputs, print
/// one line to standard error and end the process with status 1. Called by the main thread.
void CleanUpOnFatalSignals();

}  // namespace vela

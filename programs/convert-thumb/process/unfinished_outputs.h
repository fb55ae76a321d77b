// Removes the outputs of a run that fails.
#pragma once

#include <string>

namespace vela {

/// Records that this run is about to create the file. Returns false when the run is already ending
/// and the file must not be created. May be called by any thread.
bool RegisterOutput(const std::string& path);

/// Drops the latest record of this path because the file could not be opened: an existing file of
/// that name does not belong to this run. May be called by any thread.
void UnregisterOutput(const std::string& path);

/// Removes the registered regular files. From then on the run counts as ending.
void RemoveRegisteredOutputs();

/// From now on, signals after which the run cannot continue (out of memory in a library, a source
/// that shrinks while it is being read, processor time used up) remove the registered files, print
/// one line to standard error and end the process with status 1.
void CleanUpOnFatalSignals();

}  // namespace vela

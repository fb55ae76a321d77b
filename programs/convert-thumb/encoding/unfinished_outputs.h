// Leaves no outputs behind a run that fails.
#pragma once

#include <string>

namespace vela {

/// Remembers that this run is about to make the file. False when the run is ending already: then
/// the file must not be made. Any thread may call it.
bool NoteOutput(const std::string& path);

/// The file that was noted last under this name could not be opened: what is there is not this
/// run's. Any thread may call it.
void ForgetOutput(const std::string& path);

/// Removes the regular files that were noted. From then on the run is ending.
void RemoveNotedOutputs();

/// From now on signals that mean that the run cannot go on (no memory in a library, a source that
/// shrinks while it is read, no processor time left) end the process with status 1, one line on
/// standard error, and without the files that were noted.
void EndCleanlyOnFatalSignals();

}  // namespace vela

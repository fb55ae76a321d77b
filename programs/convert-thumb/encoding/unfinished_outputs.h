// Leaves no outputs behind a run that fails.
#pragma once

#include <string>

/// Remembers that this run has begun to write the file. Any thread may call it.
void NoteOutput(const std::string& path);

/// Removes the files that were noted.
void RemoveNotedOutputs();

/// From now on signals that mean that the run cannot go on (no memory in a library, a source that
/// shrinks while it is read, no processor time left) end the process with status 1, one line on
/// standard error, and without the files that were noted.
void EndCleanlyOnFatalSignals();

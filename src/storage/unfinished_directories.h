// Directories that velathumb has left unfinished although it ends with status 0. velathumb notes
// them for the queue runner, in a file that only its own user can open and that is not on the
// volume of the queue.
#pragma once

#include <functional>
#include <string>
#include <vector>

namespace vela {

/// Why a directory is unfinished.
enum class UnfinishedReason : char {
  kLocked = 'L',     ///< another process holds its lock
  kNotQueued = 'Q',  ///< it needs another run, but cannot be queued
  kUnknown = '?',    ///< too many notes: some directory, its path is empty
};

/// A directory that is unfinished, with the path that velathumb has used.
struct UnfinishedDirectory {
  UnfinishedReason reason;
  std::string path;
};

/// Makes the file, when it is missing, which begins the notes. Nothing happens when that fails.
void ExpectUnfinishedDirectories();

/// Notes that the directory is unfinished, once for the same reason. Does nothing without a file,
/// which only a runner makes, and when it fails. The notes have a limited size.
void NoteUnfinishedDirectory(const std::string& directory, UnfinishedReason reason);

/// Takes a note and returns whether it is to be removed.
using NoteFilter = std::function<bool(const UnfinishedDirectory& note)>;

/// Removes and returns the notes for which `isTaken` returns true, in the order in which they were
/// made. Returns nothing when the file cannot be read.
std::vector<UnfinishedDirectory> TakeUnfinishedDirectories(const NoteFilter& isTaken);

}  // namespace vela

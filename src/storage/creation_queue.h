// The queues of directories and videos pending conversion.
#pragma once

#include <functional>
#include <string>

namespace vela {

/// A queue: the file that is written to, and the one that is being processed.
struct CreationQueue {
  const char* file;
  const char* tempFile;
};

/// Directories whose photos need thumbnails.
inline constexpr CreationQueue kPhotoQueue = {"/var/spool/thumb_create.queue",
                                              "/var/spool/thumb_create.queue.tmp"};
/// Those of the directories in process that are done, one per line.
inline constexpr char kDonePhotosFile[] = "/var/spool/thumb_create.queue.done";
/// Directories that could not be processed, deferred to a later run.
inline constexpr char kDeferredPhotosFile[] = "/var/spool/thumb_create.queue.later";
/// Locked by the one program that processes the photo queue, as long as it runs.
inline constexpr char kQueueRunnerLock[] = "/var/run/velathumb-queue.lock";

/// Videos that need thumbnails or conversion.
inline constexpr CreationQueue kVideoQueue = {"/var/spool/flv_create.queue",
                                              "/var/spool/flv_create.queue.tmp"};

/// Returns true when the entry stands for a directory tree.
bool IsTreeEntry(const std::string& entry);

/// Returns what identifies an entry: the same for all spellings of its path.
std::string QueueEntryKey(const std::string& entry);

/// Returns true when the queue file contains a line equal to `text`.
bool HasQueueLine(const char* queueFile, const char* text);

/// Returns true when one of the queue's two files contains a line equal to `path`.
bool IsQueued(const CreationQueue& queue, const char* path);

/// How reading a queue file ended; errno is set unless it is kComplete.
enum class QueueRead {
  kComplete,
  kNotOpened,   ///< missing, not a regular file, or not readable
  kIncomplete,  ///< stopped by an error
};

/// Reads a queue file and calls `visit` with each entry, without its newline; lines of 4096 bytes
/// or more (newline included) are skipped.
QueueRead ForEachQueueEntry(const char* queueFile,
                            const std::function<void(const std::string&)>& visit);

/// Returns whether the photo queue has entries that a queue runner would process: pending ones, or
/// ones that a runner has taken and not finished. Deferred ones do not count, nor does a file that
/// cannot be read.
bool HasPhotosToProcess();

}  // namespace vela

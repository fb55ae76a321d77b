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
/// Videos that need thumbnails or conversion.
inline constexpr CreationQueue kVideoQueue = {"/var/spool/flv_create.queue",
                                              "/var/spool/flv_create.queue.tmp"};

/// Returns true when the entry stands for a directory tree.
bool IsTreeEntry(const std::string& entry);

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

}  // namespace vela

// The queues of directories and videos that wait for conversion.
#pragma once

#include <functional>
#include <string>

namespace vela {

/// A queue: the file that is written to, and the one that is being worked off.
struct CreationQueue {
  const char* file;
  const char* tempFile;
};

/// Directories whose photos wait for thumbnails.
inline constexpr CreationQueue kPhotoQueue = {"/var/spool/thumb_create.queue",
                                              "/var/spool/thumb_create.queue.tmp"};
/// Videos that wait for thumbnails and films.
inline constexpr CreationQueue kVideoQueue = {"/var/spool/flv_create.queue",
                                              "/var/spool/flv_create.queue.tmp"};

/// Begins an entry that stands for a directory with everything below it.
inline constexpr char kTreeEntryPrefix[] = "R:";

/// Returns true when the entry stands for a directory with everything below it.
bool IsTreeEntry(const std::string& entry);

/// Returns true when the queue file holds a line equal to `text`.
bool HasQueueLine(const char* queueFile, const char* text);

/// Returns true when one of the queue's two files holds a line equal to `path`.
bool IsQueued(const CreationQueue& queue, const char* path);

/// How the reading of a queue file has ended; errno tells why unless it was whole.
enum class QueueRead {
  kWhole,
  kNotOpened,  ///< not there, no regular file, or not readable
  kBrokenOff,  ///< by an error on the way
};

/// Reads a queue file and calls `visit` with each entry, without its newline; lines of 4096 bytes
/// or more (newline included) are passed over.
QueueRead ForEachQueueEntry(const char* queueFile,
                            const std::function<void(const std::string&)>& visit);

}  // namespace vela

#include "storage/creation_queue.h"

#include <algorithm>
#include <cstring>
#include <unordered_set>

#include "platform/system_rules.h"
#include "platform/vlibc.h"
#include "posix/files.h"
#include "posix/line_reader.h"
#include "posix/truncated_text.h"

namespace vela {

namespace {

/// The flags that all callers have always passed to the line search.
constexpr int kLineSearchFlags = 1028;

/// Returns the path without empty and "." components. ".." components stay: where they lead depends
/// on links.
std::string NormalizePath(const std::string& path) {
  std::string normalized;
  for (size_t begin = 0; begin < path.size();) {
    const size_t end = std::min(path.find('/', begin), path.size());
    const std::string component = path.substr(begin, end - begin);
    if (!component.empty() && component != ".") {
      normalized += (normalized.empty() && path.front() != '/' ? "" : "/") + component;
    }
    begin = end + 1;
  }
  return normalized.empty() ? path.substr(0, 1) : normalized;
}

/// Returns whether the file has an entry that is not among `done`, a set of keys.
bool HasEntryBeyond(const char* queueFile, const std::unordered_set<std::string>& done) {
  LineReader lines(queueFile);
  while (lines.IsOpen() && lines.Next()) {
    if (lines.Length() >= kPathBufferSize) {
      continue;
    }
    const std::string entry = lines.WithoutNewline();
    if (!entry.empty() && done.count(QueueEntryKey(entry)) == 0) {
      return true;
    }
  }
  return false;
}

}  // namespace

bool IsTreeEntry(const std::string& entry) {
  return entry.compare(0, std::strlen(kTreePrefix), kTreePrefix) == 0;
}

std::string QueueEntryKey(const std::string& entry) {
  const size_t begin = IsTreeEntry(entry) ? std::strlen(kTreePrefix) : 0;
  return entry.substr(0, begin) + NormalizePath(entry.substr(begin));
}

bool HasQueueLine(const char* queueFile, const char* text) {
  char line[kPathBufferSize] = "";
  const int length = VLIBCFileGetLine(queueFile, text, line, sizeof line, kLineSearchFlags);
  // The platform guarantees only that it finds a line equal to the text when there is one.
  return length > 0 && std::strlen(line) == std::strlen(text);
}

bool IsQueued(const CreationQueue& queue, const char* path) {
  if (HasQueueLine(queue.tempFile, path)) {
    return true;
  }
  return CheckAccess(queue.file, FileAccess::kRead) == 0 && HasQueueLine(queue.file, path);
}

QueueRead ForEachQueueEntry(const char* queueFile,
                            const std::function<void(const std::string&)>& visit) {
  LineReader lines(queueFile);
  if (!lines.IsOpen()) {
    return QueueRead::kNotOpened;
  }
  while (lines.Next()) {
    if (lines.Length() < kPathBufferSize) {
      visit(lines.WithoutNewline());
    }
  }
  return lines.HasFailed() ? QueueRead::kIncomplete : QueueRead::kComplete;
}

bool HasPhotosToProcess() {
  // In this order: a runner that starts meanwhile renames the first file to the second one.
  if (HasEntryBeyond(kPhotoQueue.file, {})) {
    return true;
  }
  std::unordered_set<std::string> done;
  ForEachQueueEntry(kDonePhotosFile,
                    [&](const std::string& entry) { done.insert(QueueEntryKey(entry)); });
  return HasEntryBeyond(kPhotoQueue.tempFile, done);
}

}  // namespace vela

#include "storage/creation_queue.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "platform/vlibc.h"
#include "posix/cut_text.h"

namespace vela {

namespace {

/// What the callers of the line search have always passed as its flags.
constexpr int kLineSearchFlags = 1028;

struct StreamCloser {
  void operator()(std::FILE* stream) const { std::fclose(stream); }
};

/// The lines of a file, one at a time, of any length.
class LineReader {
 public:
  /// Takes regular files only: others could keep the reader waiting for ever.
  explicit LineReader(const char* file);
  ~LineReader() { std::free(line_); }
  LineReader(const LineReader&) = delete;
  LineReader& operator=(const LineReader&) = delete;

  bool IsOpen() const { return stream_ != nullptr; }

  /// Reads the next line, its newline included. Returns false at the end and when that failed.
  bool Next() {
    length_ = getline(&line_, &capacity_, stream_.get());
    return length_ >= 0;
  }

  bool HasFailed() const { return std::ferror(stream_.get()) != 0; }

  size_t Length() const { return static_cast<size_t>(length_); }

  std::string WithoutNewline() const {
    const bool hasNewline = length_ > 0 && line_[length_ - 1] == '\n';
    return std::string(line_, Length() - (hasNewline ? 1 : 0));
  }

 private:
  std::unique_ptr<std::FILE, StreamCloser> stream_;
  char* line_ = nullptr;
  size_t capacity_ = 0;
  ssize_t length_ = 0;
};

LineReader::LineReader(const char* file) {
  const int descriptor = open(file, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
  if (descriptor < 0) {
    return;
  }
  struct stat status = {};
  if (fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode)) {
    stream_.reset(fdopen(descriptor, "r"));
  } else {
    errno = S_ISDIR(status.st_mode) ? EISDIR : EINVAL;
  }
  if (stream_ == nullptr) {
    close(descriptor);
  }
}

}  // namespace

bool IsTreeEntry(const std::string& entry) {
  return entry.compare(0, std::strlen(kTreeEntryPrefix), kTreeEntryPrefix) == 0;
}

bool HasQueueLine(const char* queueFile, const char* text) {
  char line[kPathBufferSize] = "";
  const int length = VLIBCFileGetLine(queueFile, text, line, sizeof line, kLineSearchFlags);
  // The platform promises no more than to give a line that equals the text when there is one.
  return length > 0 && std::strlen(line) == std::strlen(text);
}

bool IsQueued(const CreationQueue& queue, const char* path) {
  if (HasQueueLine(queue.tempFile, path)) {
    return true;
  }
  return access(queue.file, R_OK) == 0 && HasQueueLine(queue.file, path);
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
  return lines.HasFailed() ? QueueRead::kBrokenOff : QueueRead::kWhole;
}

}  // namespace vela

#include "posix/new_file.h"

#include <errno.h>
#include <fcntl.h>
#include <unistd.h>

#include <atomic>
#include <cstdio>

#include "posix/file_content.h"

namespace vela {

namespace {

constexpr mode_t kNewFileMode = 0666;
constexpr size_t kBufferSize = 64 * 1024;

/// Short and independent of the final name, which may be as long as names can be.
std::string NextName(const std::string& directory) {
  static std::atomic<unsigned> count{0};
  return directory + "/." + program_invocation_short_name + '.' + std::to_string(getpid()) + '.' +
         std::to_string(count++);
}

}  // namespace

NewFile::NewFile(const std::string& directory, Kind kind) {
  buffer_.reserve(kBufferSize);
  Open(directory, kind);
}

NewFile::~NewFile() {
  if (!name_.empty()) {
    unlink(name_.c_str());
  }
}

void NewFile::Open(const std::string& directory, Kind kind) {
  if (kind == Kind::kResult) {
    OpenNamed(directory);
    return;
  }
  file_.Reset(open(directory.c_str(), O_TMPFILE | O_RDWR | O_CLOEXEC, 0600));
  // Not every file system supports files without a name.
  if (!file_.IsOpen() && OpenNamed(directory) && unlink(name_.c_str()) == 0) {
    name_.clear();
  }
}

/// A name may exist already, left behind by a killed process with the same id.
bool NewFile::OpenNamed(const std::string& directory) {
  constexpr int kTries = 100;
  for (int i = 0; i < kTries && !file_.IsOpen() && (i == 0 || errno == EEXIST); ++i) {
    name_ = NextName(directory);
    file_.Reset(open(name_.c_str(), O_CREAT | O_EXCL | O_RDWR | O_CLOEXEC, kNewFileMode));
  }
  Remember(file_.IsOpen());
  if (!file_.IsOpen()) {
    name_.clear();
  }
  return file_.IsOpen();
}

void NewFile::Remember(bool isSuccess) {
  if (!isSuccess && error_ == 0) {
    error_ = errno;
  }
}

void NewFile::Append(std::string_view text) {
  if (buffer_.size() + text.size() > kBufferSize) {
    Flush();
  }
  if (text.size() > kBufferSize) {
    Write(text);
    return;
  }
  buffer_ += text;
}

void NewFile::Flush() {
  Write(buffer_);
  buffer_.clear();
}

void NewFile::Write(std::string_view text) {
  if (error_ == 0) {
    error_ = WriteAll(file_.Get(), text);
  }
}

void NewFile::AppendAllOf(NewFile& source) {
  source.Flush();
  if (source.error_ != 0) {
    error_ = error_ == 0 ? source.error_ : error_;
    return;
  }
  std::string piece(kBufferSize, '\0');
  off_t position = 0;
  ssize_t count = 1;
  while (count != 0 && error_ == 0) {
    count = pread(source.file_.Get(), piece.data(), piece.size(), position);
    if (count > 0) {
      Append(std::string_view(piece.data(), static_cast<size_t>(count)));
      position += count;
    }
    Remember(count >= 0 || errno == EINTR);
  }
}

void NewFile::Clear() {
  buffer_.clear();
  if (error_ == 0) {
    Remember(ftruncate(file_.Get(), 0) == 0 && lseek(file_.Get(), 0, SEEK_SET) == 0);
  }
}

int NewFile::MoveTo(const std::string& path) {
  Flush();
  if (error_ != 0) {
    return error_;
  }
  Remember(fsync(file_.Get()) == 0 && std::rename(name_.c_str(), path.c_str()) == 0);
  if (error_ == 0) {
    name_.clear();
  }
  return error_;
}

}  // namespace vela

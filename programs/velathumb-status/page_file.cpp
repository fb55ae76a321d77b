#include "page_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdio>

namespace vela {

namespace {

constexpr mode_t kNewFileMode = 0666;
constexpr size_t kBufferSize = 64 * 1024;

/// Short and without a part of the page's own name, which may have the greatest length there is.
std::string NextName(const std::string& directory) {
  static std::atomic<unsigned> count{0};
  return directory + "/.velathumb-status." + std::to_string(getpid()) + '.' +
         std::to_string(count++);
}

}  // namespace

PageFile::PageFile(const std::string& directory, Kind kind) {
  buffer_.reserve(kBufferSize);
  Open(directory, kind);
}

PageFile::~PageFile() {
  if (file_ >= 0) {
    close(file_);
  }
  if (!name_.empty()) {
    unlink(name_.c_str());
  }
}

void PageFile::Open(const std::string& directory, Kind kind) {
  if (kind == Kind::kResult) {
    OpenNamed(directory);
    return;
  }
  file_ = open(directory.c_str(), O_TMPFILE | O_RDWR | O_CLOEXEC, 0600);
  // Not every file system has files that never had a name.
  if (file_ < 0 && OpenNamed(directory) && unlink(name_.c_str()) == 0) {
    name_.clear();
  }
}

/// Left behind by a process of the same number that was killed, a name may be taken.
bool PageFile::OpenNamed(const std::string& directory) {
  constexpr int kTries = 100;
  for (int i = 0; i < kTries && file_ < 0 && (i == 0 || errno == EEXIST); ++i) {
    name_ = NextName(directory);
    file_ = open(name_.c_str(), O_CREAT | O_EXCL | O_RDWR | O_CLOEXEC, kNewFileMode);
  }
  Remember(file_ >= 0);
  if (file_ < 0) {
    name_.clear();
  }
  return file_ >= 0;
}

void PageFile::Remember(bool isDone) {
  if (!isDone && error_ == 0) {
    error_ = errno;
  }
}

void PageFile::Append(std::string_view text) {
  if (buffer_.size() + text.size() > kBufferSize) {
    Flush();
  }
  if (text.size() > kBufferSize) {
    Write(text);
    return;
  }
  buffer_ += text;
}

void PageFile::Flush() {
  Write(buffer_);
  buffer_.clear();
}

void PageFile::Write(std::string_view text) {
  while (!text.empty() && error_ == 0) {
    const ssize_t count = write(file_, text.data(), text.size());
    Remember(count >= 0 || errno == EINTR);
    if (count > 0) {
      text.remove_prefix(static_cast<size_t>(count));
    }
  }
}

void PageFile::AppendAllOf(PageFile& source) {
  source.Flush();
  if (source.error_ != 0) {
    error_ = error_ == 0 ? source.error_ : error_;
    return;
  }
  std::string piece(kBufferSize, '\0');
  off_t position = 0;
  ssize_t count = 1;
  while (count != 0 && error_ == 0) {
    count = pread(source.file_, piece.data(), piece.size(), position);
    if (count > 0) {
      Append(std::string_view(piece.data(), static_cast<size_t>(count)));
      position += count;
    }
    Remember(count >= 0 || errno == EINTR);
  }
}

void PageFile::Clear() {
  buffer_.clear();
  if (error_ == 0) {
    Remember(ftruncate(file_, 0) == 0 && lseek(file_, 0, SEEK_SET) == 0);
  }
}

int PageFile::MoveTo(const std::string& path) {
  Flush();
  if (error_ != 0) {
    return error_;
  }
  Remember(fsync(file_) == 0 && std::rename(name_.c_str(), path.c_str()) == 0);
  if (error_ == 0) {
    name_.clear();
  }
  return error_;
}

}  // namespace vela
